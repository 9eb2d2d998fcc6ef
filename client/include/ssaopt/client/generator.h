// Random programs in the textual format, for differential testing of the whole pipeline: several
// procedures with formals and calls (nested, and recursive, directly or mutually, under a depth
// bound), nested if/else, loops bounded by a counter, outlined blocks, every data type with scaling
// and saturation, volatile inputs, arrays with constant and variable indexes, external calls,
// conditions that constants decide and assignments that both branches of an if/else begin with.
// Every program the generator writes loads without errors and reaches the end of every procedure.
#pragma once

#include <cstdint>
#include <string>

namespace ssaopt::client {

// The size the tool uses where none is given: a handful of procedures of about this many
// statements each.
inline constexpr std::uint64_t kDefaultProgramSize = 10;

// The same seed and size give the same text on every platform: the generator draws from its own
// splitmix64 sequence rather than the standard library's distributions.
std::string generateProgram(std::uint64_t seed, std::uint64_t size = kDefaultProgramSize);

}  // namespace ssaopt::client

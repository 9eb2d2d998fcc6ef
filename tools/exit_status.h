// The tool's exit status, the same for every command.
#pragma once

namespace ssaopt::tool {

inline constexpr int kSuccess = 0;
// The program has errors, a check found a difference or a failure, or the result could not be written.
inline constexpr int kFailure = 1;
// The command line is wrong: an unknown option or pass, a bad number, a missing or unreadable file.
inline constexpr int kMisuse = 2;

}  // namespace ssaopt::tool

// Makes a failing program smaller while it keeps failing.
#pragma once

#include <functional>
#include <string>

namespace ssaopt::tool {

// The smallest program found by dropping lines (statements, labels, whole blocks and procedures,
// declarations) and by turning conditional jumps into plain ones, keeping only changes after which
// `fails` still holds. `fails(text)` must hold. Tries at most `attempts` candidates.
std::string shrinkProgram(const std::string& text, const std::function<bool(const std::string&)>& fails,
                          std::size_t attempts = 2000);

}  // namespace ssaopt::tool

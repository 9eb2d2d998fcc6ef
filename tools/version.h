// The version of the tool: the project's version, and where it was built from a git checkout the
// description of that checkout.
#pragma once

#include <string>

namespace ssaopt::tool {

// "ssaopt 0.2.0", or "ssaopt 0.2.0 (git v0.2.0-3-gabc1234-dirty)".
std::string versionText();

}  // namespace ssaopt::tool

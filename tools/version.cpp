#include "version.h"

// Written at build time by cmake/git_description.cmake: SSAOPT_GIT_DESCRIPTION, empty outside a
// checkout.
#include "git_description.h"

namespace ssaopt::tool {

std::string versionText() {
  std::string text = std::string("ssaopt ") + SSAOPT_VERSION;
  std::string description = SSAOPT_GIT_DESCRIPTION;
  return description.empty() ? text : text + " (git " + description + ")";
}

}  // namespace ssaopt::tool

// ssaopt [options] FILE: see usageText() in options.cpp.
#include <iostream>
#include <string>
#include <vector>

#include "behaviour.h"
#include "driver.h"
#include "fuzz.h"
#include "options.h"

namespace {

constexpr int kUsageError = 2;

}  // namespace

int main(int argc, char** argv) {
  ssaopt::tool::ParsedOptions parsed =
      ssaopt::tool::parseOptions(std::vector<std::string>(argv + 1, argv + argc));
  if (!parsed.error.empty()) {
    std::cerr << "ssaopt: " << parsed.error << "\n" << ssaopt::tool::usageText();
    return kUsageError;
  }
  if (parsed.options.help) {
    std::cout << ssaopt::tool::usageText();
    return 0;
  }
  if (parsed.options.version) {
    std::cout << "ssaopt " << SSAOPT_VERSION << "\n";
    return 0;
  }
  ssaopt::tool::Command command = parsed.options.command;
  if (command == ssaopt::tool::Command::Generate || command == ssaopt::tool::Command::Fuzz)
    return ssaopt::tool::runGeneratorCommand(parsed.options, std::cout, std::cerr);
  if (command != ssaopt::tool::Command::Transform)
    return ssaopt::tool::runBehaviourCommand(parsed.options, std::cout, std::cerr);
  return ssaopt::tool::runTool(parsed.options, std::cout, std::cerr);
}

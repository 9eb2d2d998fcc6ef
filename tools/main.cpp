// ssaopt [options] FILE: see usageText() in options.cpp.
#include <cerrno>
#include <cstring>
#include <filesystem>
#include <fstream>
#include <iostream>
#include <new>
#include <string>
#include <vector>

#include "behaviour.h"
#include "cc_check.h"
#include "driver.h"
#include "exit_status.h"
#include "fuzz.h"
#include "options.h"

namespace {

// Why the file at `path` cannot be read, or "" when it can. Checked before any work starts, so that a
// wrong file name is a command-line error rather than an error in the program.
std::string unreadableFile(const std::string& path) {
  std::error_code error;
  if (std::filesystem::is_directory(path, error)) return "cannot read '" + path + "': it is a directory";
  std::ifstream file(path, std::ios::binary);
  if (!file) return "cannot read '" + path + "': " + std::strerror(errno);
  return "";
}

std::string checkFiles(const ssaopt::tool::Options& options) {
  std::string error;
  if (!options.inputPath.empty()) error = unreadableFile(options.inputPath);
  if (error.empty() && options.inputsPath) error = unreadableFile(*options.inputsPath);
  return error;
}

int dispatch(const ssaopt::tool::Options& options) {
  using ssaopt::tool::Command;
  if (options.command == Command::Generate || options.command == Command::Fuzz)
    return ssaopt::tool::runGeneratorCommand(options, std::cout, std::cerr);
  if (options.command == Command::CcCheck)
    return ssaopt::tool::runCcCheckCommand(options, std::cout, std::cerr);
  if (options.command != Command::Transform)
    return ssaopt::tool::runBehaviourCommand(options, std::cout, std::cerr);
  return ssaopt::tool::runTool(options, std::cout, std::cerr);
}

}  // namespace

int main(int argc, char** argv) {
  ssaopt::tool::ParsedOptions parsed =
      ssaopt::tool::parseOptions(std::vector<std::string>(argv + 1, argv + argc));
  const ssaopt::tool::Options& options = parsed.options;
  if (parsed.error.empty() && !options.help && !options.version) parsed.error = checkFiles(options);
  if (!parsed.error.empty()) {
    std::cerr << "ssaopt: " << parsed.error << " (ssaopt --help shows the usage)\n";
    return ssaopt::tool::kMisuse;
  }
  if (options.help) {
    std::cout << ssaopt::tool::usageText();
    return ssaopt::tool::kSuccess;
  }
  if (options.version) {
    std::cout << "ssaopt " << SSAOPT_VERSION << "\n";
    return ssaopt::tool::kSuccess;
  }
  // The one exception anything throws: running out of memory, wherever it happens, ends the run.
  try {
    return dispatch(options);
  } catch (const std::bad_alloc&) {
    std::cerr << "ssaopt: out of memory\n";
    return ssaopt::tool::kFailure;
  }
}

// ssaopt [options] FILE and its commands: see usageText() in options.cpp.
#include <unistd.h>

#include <cerrno>
#include <cstdlib>
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
#include "reduce.h"
#include "ssaopt/client/diagnostics.h"
#include "version.h"

namespace {

using ssaopt::tool::Command;
using ssaopt::tool::Options;

// Why the file at `path` cannot be read, or "" when it can ("-", standard input, always can). Checked
// before any work starts, so that a wrong file name is a command-line error rather than an error in
// the program.
std::string unreadableFile(const std::string& path) {
  if (path == "-") return "";
  std::error_code error;
  if (std::filesystem::is_directory(path, error)) return "cannot read '" + path + "': it is a directory";
  std::ifstream file(path, std::ios::binary);
  if (!file) return "cannot read '" + path + "': " + std::strerror(errno);
  return "";
}

std::string checkFiles(const Options& options) {
  std::string error;
  if (!options.inputPath.empty()) error = unreadableFile(options.inputPath);
  if (error.empty() && options.inputsPath) error = unreadableFile(*options.inputsPath);
  return error;
}

// Colours for a terminal that has not asked for none (the NO_COLOR convention), or when told.
bool wantsColours(ssaopt::tool::ColourMode mode) {
  if (mode != ssaopt::tool::ColourMode::Auto) return mode == ssaopt::tool::ColourMode::Always;
  const char* pNoColour = std::getenv("NO_COLOR");
  return isatty(STDERR_FILENO) && !(pNoColour && *pNoColour);
}

int dispatch(const Options& options) {
  switch (options.command) {
    case Command::Generate:
    case Command::Fuzz:
      return ssaopt::tool::runGeneratorCommand(options, std::cout, std::cerr);
    case Command::CcCheck:
      return ssaopt::tool::runCcCheckCommand(options, std::cout, std::cerr);
    case Command::Run:
    case Command::Check:
      return ssaopt::tool::runBehaviourCommand(options, std::cout, std::cerr);
    case Command::Reduce:
      return ssaopt::tool::runReduceCommand(options, std::cout, std::cerr);
    case Command::Transform:
      break;
  }
  return ssaopt::tool::runTool(options, std::cout, std::cerr);
}

}  // namespace

int main(int argc, char** argv) {
  ssaopt::tool::ParsedOptions parsed =
      ssaopt::tool::parseOptions(std::vector<std::string>(argv + 1, argv + argc));
  const Options& options = parsed.options;
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
    std::cout << ssaopt::tool::versionText() << "\n";
    return ssaopt::tool::kSuccess;
  }
  ssaopt::client::setDiagnosticColours(wantsColours(options.colour));
  // The one exception anything throws: running out of memory, wherever it happens, ends the run.
  try {
    return dispatch(options);
  } catch (const std::bad_alloc&) {
    std::cerr << "ssaopt: out of memory\n";
    return ssaopt::tool::kFailure;
  }
}

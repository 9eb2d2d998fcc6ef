// Running other processes: the C compiler and the programs it made (cc-check), another ssaopt (the
// determinism check of fuzz, reduce), and the command that reduce keeps failing.
#pragma once

#include <chrono>
#include <filesystem>
#include <string>
#include <vector>

namespace ssaopt::tool {

struct Outcome {
  bool started = false;
  bool timedOut = false;
  int status = -1;  // the exit status, or -1 after a signal
  std::string out;
  std::string err;
};

// Runs `arguments` (the first found on the PATH) with standard input from `input` ("" for none) and its
// output captured in files of `directory`, killing it after `timeout`.
Outcome runProcess(const std::vector<std::string>& arguments, const std::filesystem::path& input,
                   const std::filesystem::path& directory, std::chrono::milliseconds timeout);

// A directory of our own under the temporary directory, removed with everything in it at the end;
// an empty path when it could not be made.
class TemporaryDirectory {
public:
  // `prefix` names the directory: "ssaopt-cc" gives /tmp/ssaopt-cc-XXXXXX.
  explicit TemporaryDirectory(const std::string& prefix);
  ~TemporaryDirectory();
  TemporaryDirectory(const TemporaryDirectory&) = delete;
  TemporaryDirectory& operator=(const TemporaryDirectory&) = delete;

  const std::filesystem::path& path() const { return m_Path; }

private:
  std::filesystem::path m_Path;
};

// The executable of this process, or "" when it cannot be found.
std::string ownExecutable();

std::string contentsOf(const std::filesystem::path& path);

}  // namespace ssaopt::tool

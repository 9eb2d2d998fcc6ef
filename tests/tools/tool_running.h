// Runs the built ssaopt tool as a user does, for the tests of its commands.
#pragma once

#include <gtest/gtest.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <sstream>
#include <string>

namespace tooltest {

struct Result {
  int status;
  std::string out;
  std::string err;
};

// The directory of this test process's files, removed when the process ends; of its own, so that tests
// may run in parallel, also with the tests of another build on the machine.
inline const std::string& testDirectory() {
  struct Directory {
    Directory() : path(::testing::TempDir() + "ssaopt-tests-" + std::to_string(getpid())) {
      std::filesystem::create_directories(path);
    }
    ~Directory() {
      std::error_code ignored;
      std::filesystem::remove_all(path, ignored);
    }
    std::string path;
  };
  static const Directory directory;
  return directory.path;
}

// A path of the running test's own.
inline std::string pathOf(const std::string& name) {
  const ::testing::TestInfo* pTest = ::testing::UnitTest::GetInstance()->current_test_info();
  return testDirectory() + "/" + pTest->test_suite_name() + "_" + pTest->name() + "_" + name;
}

inline std::string contentsOf(const std::string& path) {
  std::ifstream file(path);
  std::ostringstream text;
  text << file.rdbuf();
  return text.str();
}

inline std::string fileWith(const std::string& name, const std::string& text) {
  std::ofstream(pathOf(name)) << text;
  return pathOf(name);
}

// Runs the tool with `arguments`, and with `environment` ("NAME=value ...") set for it.
inline Result ssaopt(const std::string& arguments, const std::string& environment = "") {
  std::string command = (environment.empty() ? "" : environment + " ") + std::string(SSAOPT_TOOL) + " " +
                        arguments + " >'" + pathOf("out") + "' 2>'" + pathOf("err") + "'";
  int status = std::system(command.c_str());
  return Result{WIFEXITED(status) ? WEXITSTATUS(status) : -1, contentsOf(pathOf("out")),
                contentsOf(pathOf("err"))};
}

inline std::string example(const char* name) {
  return std::string(SSAOPT_EXAMPLES_DIR) + "/" + name + ".ssa";
}

}  // namespace tooltest

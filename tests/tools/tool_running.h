// Runs the built ssaopt tool as a user does, for the tests of its commands.
#pragma once

#include <gtest/gtest.h>
#include <sys/wait.h>

#include <cstdlib>
#include <fstream>
#include <sstream>
#include <string>

namespace tooltest {

struct Result {
  int status;
  std::string out;
  std::string err;
};

// A path of the running test's own, so that tests may run in parallel.
inline std::string pathOf(const std::string& name) {
  const ::testing::TestInfo* pTest = ::testing::UnitTest::GetInstance()->current_test_info();
  return ::testing::TempDir() + "ssaopt_" + pTest->test_suite_name() + "_" + pTest->name() + "_" + name;
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

inline Result ssaopt(const std::string& arguments) {
  std::string command =
      std::string(SSAOPT_TOOL) + " " + arguments + " >'" + pathOf("out") + "' 2>'" + pathOf("err") + "'";
  int status = std::system(command.c_str());
  return Result{WIFEXITED(status) ? WEXITSTATUS(status) : -1, contentsOf(pathOf("out")),
                contentsOf(pathOf("err"))};
}

inline std::string example(const char* name) {
  return std::string(SSAOPT_EXAMPLES_DIR) + "/" + name + ".ssa";
}

}  // namespace tooltest

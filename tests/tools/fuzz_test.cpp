// The generate and fuzz commands: generated programs are the same for the same seed, load, and keep
// their behaviour through the pipeline.
#include <gtest/gtest.h>

#include <string>

#include "client/client_testing.h"
#include "ssaopt/client/generator.h"
#include "tools/tool_running.h"

namespace {

using tooltest::Result;
using tooltest::ssaopt;

// Seeds 1 to 60 held programs that lost a volatile Boolean's read when the valid-condition step
// replaced a comparison its type decides ("in != 5"); they keep it now.
constexpr const char* kPassingRange = "--programs 60 --seed 1";

class Generator : public clienttest::ClientTest {};

TEST_F(Generator, SameSeedGivesTheSameTextAndItLoads) {
  for (std::uint64_t seed : {1u, 2u, 77u}) {
    std::string text = ssaopt::client::generateProgram(seed);
    EXPECT_EQ(text, ssaopt::client::generateProgram(seed)) << seed;
    EXPECT_NE(load(text), nullptr) << seed;
    Result tool = ssaopt("generate --seed " + std::to_string(seed));
    EXPECT_EQ(tool.status, 0) << tool.err;
    EXPECT_EQ(tool.out, text) << seed;
  }
  EXPECT_NE(ssaopt::client::generateProgram(1), ssaopt::client::generateProgram(2));
}

TEST_F(Generator, EverySizeAndSeedLoadsWithoutErrors) {
  for (std::uint64_t size : {1u, 10u, 40u})
    for (std::uint64_t seed = 1; seed <= 50; ++seed) {
      ssaopt::client::LoadResult loaded =
          ssaopt::client::loadProgram(ssaopt::client::generateProgram(seed, size));
      EXPECT_NE(loaded.program, nullptr) << "seed " << seed << " size " << size << "\n"
                                         << diagnosticsOf(loaded);
    }
}

TEST(ToolFuzz, GeneratedProgramsKeepTheirBehaviourThroughTheDefaultPipeline) {
  Result result = ssaopt(std::string("fuzz ") + kPassingRange);
  EXPECT_EQ(result.status, 0) << result.err;
  EXPECT_EQ(result.err, "");
  EXPECT_NE(result.out.find("fuzz: 60 programs, 0 failures"), std::string::npos) << result.out;
}

TEST(ToolFuzz, NoPassesFindNoFailure) {
  Result result = ssaopt("fuzz --programs 20 --seed 1 --passes=");
  EXPECT_EQ(result.status, 0) << result.err;
}

TEST(ToolFuzz, MisusesAreCommandLineErrors) {
  for (const char* arguments :
       {"fuzz --programs 0", "fuzz --passes=nosuch", "generate --programs 3", "generate somefile.ssa",
        "fuzz --steps 4", "--size 3 somefile.ssa", "generate --seed x"}) {
    Result result = ssaopt(arguments);
    EXPECT_EQ(result.status, 2) << arguments << "\n" << result.err;
    EXPECT_EQ(result.out, "") << arguments;
  }
}

}  // namespace

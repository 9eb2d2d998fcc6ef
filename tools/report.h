// The HTML report of the main command (--emit=html): one self-contained page with the program after
// each step of the pipeline beside the program before it, the changes highlighted; the Graphviz
// picture of each step as inline SVG where Graphviz's dot is installed; and the figures of --stats and
// --time-passes.
#pragma once

#include <string>
#include <vector>

#include "options.h"
#include "ssaopt/client/program.h"

namespace ssaopt::tool {

// Pictures of graphs with more nodes than this are left out: dot takes minutes on them, and nobody
// reads them.
inline constexpr int kMaxPictureNodes = 3000;

class Report {
public:
  explicit Report(const Options& options) : m_Options(options) {}

  // The program after a step: after the front end first, then after each pass, with its time.
  void addStep(const std::string& name, const client::Program& program, double milliseconds);

  // The page, with the figures as --stats and --time-passes print them.
  std::string page(const std::string& statistics, const std::string& times) const;

private:
  struct Step {
    std::string name;
    std::string text;
    std::string picture;  // inline SVG, or empty
    double milliseconds;
  };

  std::string pictureOf(const client::Program& program);
  std::string stepSection(std::size_t i) const;

  const Options& m_Options;
  std::vector<Step> m_Steps;
  std::string m_PictureNote;  // why there are no pictures, where there are none
};

}  // namespace ssaopt::tool

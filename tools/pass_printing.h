// What the main command prints to standard error along the pipeline: the program after every pass
// (--print-after-all), before or after the passes named (--print-before, --print-after), and what each
// pass changed, as a unified diff (--print-changed); only one procedure with --filter-procedure.
#pragma once

#include <optional>
#include <ostream>
#include <string>

#include "options.h"
#include "ssaopt/client/program.h"

namespace ssaopt::tool {

class PassPrinter {
public:
  PassPrinter(const Options& options, std::ostream& err) : m_Options(options), m_Err(err) {}

  // Whether any printing was asked for.
  bool active() const;

  void beforePass(const std::string& pass, const client::Program& program);
  void afterPass(const std::string& pass, const client::Program& program);

private:
  std::string printed(const client::Program& program) const;

  const Options& m_Options;
  std::ostream& m_Err;
  std::optional<std::string> m_Before;  // the program before the pass running, for --print-changed
};

}  // namespace ssaopt::tool

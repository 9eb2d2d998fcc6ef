#include "pass_printing.h"

#include <algorithm>

#include "ssaopt/client/printer.h"
#include "text.h"

namespace ssaopt::tool {

namespace {

bool names(const std::vector<std::string>& passes, const std::string& pass) {
  return std::find(passes.begin(), passes.end(), pass) != passes.end();
}

}  // namespace

bool PassPrinter::active() const {
  return m_Options.printAfterAll || m_Options.printChanged || !m_Options.printBefore.empty() ||
         !m_Options.printAfter.empty();
}

void PassPrinter::beforePass(const std::string& pass, const client::Program& program) {
  if (names(m_Options.printBefore, pass)) m_Err << "// ---- before " << pass << " ----\n" << printed(program);
  if (m_Options.printChanged && !m_Before) m_Before = printed(program);
}

void PassPrinter::afterPass(const std::string& pass, const client::Program& program) {
  if (m_Options.printAfterAll || names(m_Options.printAfter, pass))
    m_Err << "// ---- after " << pass << " ----\n" << printed(program);
  if (!m_Options.printChanged) return;
  std::string after = printed(program);
  m_Err << unifiedDiff(*m_Before, after, "before " + pass, "after " + pass);
  m_Before = std::move(after);
}

std::string PassPrinter::printed(const client::Program& program) const {
  client::PrintOptions options;
  options.procedure = m_Options.filterProcedure.value_or("");
  return client::printProgram(program, options);
}

}  // namespace ssaopt::tool

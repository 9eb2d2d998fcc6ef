// The library's internal checks switched on for a run, its verifier after the front end and every
// pass, and what they report: the driver's --verify and every program of the fuzz command use it.
#pragma once

#include <ostream>
#include <string>

#include "ssaopt/frame/report.h"
#include "ssaopt/ir/edge_info.h"

namespace ssaopt::tool {

class Verification {
public:
  Verification() { ssaopt::setShowInternalInfo(true); }
  ~Verification() { ssaopt::setShowInternalInfo(false); }
  Verification(const Verification&) = delete;
  Verification& operator=(const Verification&) = delete;

  // The library's verifier: every violation is reported, then the condition "verify()" named after
  // what the graph was checked after.
  void checkGraph(const KvCControlFlowGraph& graph, const std::string& after) {
    if (!graph.verify()) ssaopt::reportConsistencyFailure(after.c_str(), 0, "verify()");
  }

  // Writes every report; true when there was none.
  bool writeReports(std::ostream& err) const {
    for (const std::string& message : m_Log.messages()) err << "ssaopt: verify: " << message << "\n";
    for (const ssaopt::ReportLog::Consistency& failure : m_Log.consistencyFailures())
      err << "ssaopt: verify: consistency condition \"" << failure.condition << "\" failed (" << failure.file
          << ":" << failure.line << ")\n";
    if (!m_Log.empty()) err << "ssaopt: verify: " << m_Log.count() << " report(s)\n";
    return m_Log.empty();
  }

private:
  ssaopt::ReportLog m_Log;
};

}  // namespace ssaopt::tool

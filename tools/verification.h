// The library's internal checks switched on for a run, and what they report: the driver's --verify
// and every program of the fuzz command use it.
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

  // The check every transformation keeps, reported as the SSA driver reports it.
  void checkGraph(const KvCControlFlowGraph& graph, const std::string& after) {
    if (!graph.checkConsistency()) ssaopt::reportConsistencyFailure(after.c_str(), 0, "checkConsistency()");
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

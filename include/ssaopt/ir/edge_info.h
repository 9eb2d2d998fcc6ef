// Payloads of the control-flow graph's edges: plain control flow, the true and false branches out of a
// block with a condition, and the SSA def-use edges that constant propagation adds to the same graph.
// The graph never deletes a payload; whoever does deletes it through a KvCCfgEdgeInfo pointer, so the
// destructor is virtual.
#pragma once

#include <cstdint>

#include "ssaopt/frame/memory.h"
#include "ssaopt/ir/forward.h"

class KvCCfgEdgeInfo {
public:
  SSAOPT_MODULE_ALLOCATED

  KvCCfgEdgeInfo();
  // A copy keeps the index of its source.
  KvCCfgEdgeInfo(const KvCCfgEdgeInfo&) = default;
  KvCCfgEdgeInfo& operator=(const KvCCfgEdgeInfo&) = default;

  // Virtual operations, in slot order.
  virtual ~KvCCfgEdgeInfo() = default;
  virtual KvCCfgTrueBranch* isTrueBranch() { return nullptr; }
  virtual KvCCfgFalseBranch* isFalseBranch() { return nullptr; }
  // Non-null exactly for the SSA edges, which share the graph with the control-flow edges.
  virtual KvCSSAEdge* isSSAEdge() { return nullptr; }

  // The executable mark of sparse conditional constant propagation.
  bool isEdgeExecutable() const { return m_IsExecutable; }
  void activateEdgeExecutable() { m_IsExecutable = true; }
  void deactivateEdgeExecutable() { m_IsExecutable = false; }
  std::uint32_t getIndex() const { return m_Index; }
  // All four edge classes share this counter.
  static void boot();

private:
  static std::uint32_t s_GlobIndexCnt;

  bool m_IsExecutable = false;
  std::uint32_t m_Index;
};

class KvCCfgTrueBranch : public KvCCfgEdgeInfo {
public:
  KvCCfgTrueBranch* isTrueBranch() override { return this; }
};

class KvCCfgFalseBranch : public KvCCfgEdgeInfo {
public:
  KvCCfgFalseBranch* isFalseBranch() override { return this; }
};

// From a definition to a use.
class KvCSSAEdge : public KvCCfgEdgeInfo {
public:
  KvCSSAEdge* isSSAEdge() override { return this; }
};

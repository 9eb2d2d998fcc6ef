// The control-flow graph of a whole program. Every procedure is one connected component of this one
// graph, entered at its entry node and, once exits are placed, left at its exit node; a call is a
// statement naming its procedure, never an edge into it. Nodes carry KvCCfgNodeInfo payloads (blocks,
// entries, exits) and edges KvCCfgEdgeInfo payloads (plain, true and false branches, SSA edges).
//
// Invariants that every transformation keeps (checkConsistency verifies the first three):
//   1. each procedure occupies exactly one connected component, edge directions ignored;
//   2. its entry node is the only node of that component without in-edges;
//   3. every node of the component has the procedure as its payload's procedure;
//   4. the entry node has exactly one out-edge, to the procedure's first block;
//   5. a block with a condition has a true and a false out-edge, all other control flow is plain;
//   6. the calling block does not connect to the called procedure's nodes.
//
// Ownership: the graph stores payload pointers and deletes none of them, nor any procedure record,
// statement or expression; only makeProcedureAndCall deletes the payloads of the edges it replaces
// by calls.
//
// The members are grouped by concern, one source file each (src/cfg/).
#pragma once

#include "ssaopt/frame/containers.h"
#include "ssaopt/frame/graph.h"
#include "ssaopt/frame/string.h"
#include "ssaopt/ir/edge_info.h"
#include "ssaopt/ir/forward.h"
#include "ssaopt/ir/node_info.h"

class KvCControlFlowGraph : public ssaopt::GRAPH<KvCCfgNodeInfo*, KvCCfgEdgeInfo*> {
public:
  // Procedure name -> record, iterated in ascending name order. The table does not own the records.
  using ProcedureTable = ssaopt::string_map<KvCCfgProcedure*>;

  static constexpr const char* kMainProcedureName = "#main";

  KvCControlFlowGraph() = default;
  ~KvCControlFlowGraph() override = default;
  // A copy's start node and procedure records would still name the nodes of this graph; nothing
  // needs a copy, so none can be made.
  KvCControlFlowGraph(const KvCControlFlowGraph&) = delete;
  KvCControlFlowGraph& operator=(const KvCControlFlowGraph&) = delete;

  // ---- The graph object (graph.cpp) ------------------------------------------------------------

  // The node at which the program starts; the client sets it.
  ssaopt::node getStartNode() const { return m_StartNode; }
  void setStartNode(ssaopt::node v) { m_StartNode = v; }

  // The record of procedure `name`, or null.
  KvCCfgProcedure* findProcedure(const BxCXString& name) const;
  const ProcedureTable& getProcedures() const { return m_Procedures; }

  // The block that `v` carries, or null for an entry, an exit or a node without payload.
  KvCBasicBlock* getBasicBlock(ssaopt::node v) const;

  // False when the number of components differs from the number of procedures. While internal
  // information is shown, also reports every node that breaks invariant 2 or 3 (without changing
  // the result).
  bool checkConsistency() const;

  // ---- Block surgery (graph.cpp) ---------------------------------------------------------------

  // Splits the block of `v` so that `pStatement` begins a new block, which takes over the out-edges;
  // returns the node that now holds `pStatement` (`v` itself when nothing was split).
  ssaopt::node splitAtStatement(ssaopt::node v, KvCCfgStatement* pStatement);
  // Moves the condition of `v`'s block, with the out-edges, into a new block after it; returns the
  // node that now holds the condition (`v` itself when nothing was split).
  ssaopt::node splitAtCondition(ssaopt::node v);
  // Replaces every block by a chain of blocks holding one phi function, one statement or the
  // condition each.
  void divideBasicBlock();
  // The node whose block evaluates `pCond`, found by walking forward from `v` through straight-line
  // blocks and into the procedures that dead ends call; `v` itself when the walk cannot go on.
  ssaopt::node findBranchNode(ssaopt::node v, KvCCfgExpression* pCond) const;

  // ---- Procedures and calls (procedures.cpp) ---------------------------------------------------

  // The entry node of procedure `name`, with `pProcedure` set to its record; both are created when
  // the name is new.
  ssaopt::node demandProcedureEntryNode(const BxCXString& name, KvCCfgProcedure*& pProcedure);
  // Makes the code from `v` onwards a procedure of its own and calls it from every predecessor;
  // returns a further call of it, which the caller owns (null after an internal error).
  KvCCfgProcedureCall* makeProcedureAndCall(ssaopt::node v);
  // Records the argument of each formal for `pCall`; empties both lists.
  void setParametersOfCall(KvCCfgProcedureCall* pCall, ssaopt::list<KvCCfgVariable*>& formals,
                           ssaopt::list<KvCCfgExpression*>& arguments);
  // Gives every procedure an exit node, reached from all of its dead ends.
  void placeExitNodes();
  // Closes "#main" into a loop, so that analyses see it executed again and again.
  void placeLoopAroundMain();

  // ---- SSA construction and the optimisations join here, each in a source file of its own ------

private:
  friend class KvCControlFlowGraphTestAccess;

  // Class name and file of the internal error and consistency reports.
  static constexpr const char* kClassName = "KvCControlFlowGraph";

  // ---- Shared mechanism (graph.cpp) ------------------------------------------------------------

  // Reports the consistency condition "0" and the internal error at `line`: a case that a
  // consistent graph never reaches.
  static void reportInternalFault(int line);
  // The block of `v`, or null after reporting `lineNoPayload` or `lineNoBlock`.
  KvCBasicBlock* requireBasicBlock(ssaopt::node v, int lineNoPayload, int lineNoBlock) const;
  // The target of the entry node's first out-edge, or nil.
  ssaopt::node firstBlockOf(const KvCCfgProcedure& procedure) const;
  ssaopt::node newBlockNode(KvCCfgProcedure* pProcedure);
  ssaopt::edge newPlainEdge(ssaopt::node v, ssaopt::node w);

  // ---- Block surgery (graph.cpp) ---------------------------------------------------------------

  ssaopt::node continueInNewNode(ssaopt::node v, KvCBasicBlock* pBlock, KvCBasicBlock* pTail);
  void replaceByChain(ssaopt::node v, const KvCBasicBlock& block);
  ssaopt::node firstBlockOfCallee(ssaopt::node deadEnd, const KvCBasicBlock& block) const;
  void reportProcedureComponentFaults(const ssaopt::node_array<int>& component, int count) const;

  // ---- Visited marks: set by constant propagation, read by dead-code elimination ---------------

  void setVisited(ssaopt::node v) { m_Visited[v] = true; }
  bool isVisited(ssaopt::node v) const { return m_Visited[v]; }
  void clearAllVisited() { m_Visited.fill(false); }

  // ---- Procedures and calls (procedures.cpp) ---------------------------------------------------

  // Fills `fcg` with one node per procedure and one edge per call of another procedure, and
  // refreshes every node's procedure from reachability.
  void buildFunctionCallGraph(ssaopt::graph& fcg, ssaopt::map<ssaopt::node, KvCCfgProcedure*>& procedureOf);

  KvCCfgProcedure* newProcedure(const BxCXString& name);
  ssaopt::list<ssaopt::node> reachableFrom(ssaopt::node v);
  bool canBeSplitOff(ssaopt::node v);
  bool predecessorsCanHoldCalls(ssaopt::node v) const;
  KvCCfgProcedure* splitOff(ssaopt::node v, const BxCXString& name);
  void redirectPredecessorsToCalls(ssaopt::node v, const BxCXString& name);
  void moveRegion(ssaopt::node v, KvCCfgProcedure* pOld, KvCCfgProcedure* pNew);
  void makeSingleEntry(KvCCfgProcedure* pProcedure);
  ssaopt::node nodeEnteredFromOutside(ssaopt::node entry);
  KvCCfgProcedure* splitOffHeader(ssaopt::node header);
  ssaopt::node insertEmptyBlockBefore(ssaopt::node v);
  bool isDeadEnd(ssaopt::node v) const;
  void claimReachableNodes(KvCCfgProcedure* pProcedure, ssaopt::node_array<int>& dist);
  void addCallEdges(const KvCBasicBlock& block, ssaopt::graph& fcg,
                    ssaopt::map<ssaopt::node, KvCCfgProcedure*>& procedureOf) const;

  ssaopt::node m_StartNode;
  ProcedureTable m_Procedures;
  // Absent entries read as false.
  ssaopt::node_array<bool> m_Visited;
  // Reached-marks for the walks of makeProcedureAndCall: all false between walks, so that a walk
  // costs the size of what it reaches, not of the whole graph.
  ssaopt::node_array<bool> m_Reached;
};

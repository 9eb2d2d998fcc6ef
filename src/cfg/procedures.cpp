// Procedures and calls: the procedure table's entries, turning a region into a procedure with calls
// in its place, call arguments, exit nodes, the loop around "#main", and the function call graph.
//
//   before:  #main: E -> A [x = 1] -> B [y = x] -> C [if (y)] ...
//   makeProcedureAndCall(B):
//            #main:     E  -> A [x = 1; call #block_7]
//            #block_7:  E' -> B [y = x] -> C [if (y)] ...
//   placeExitNodes(), placeLoopAroundMain():
//            #main:     E  -> A [x = 1; call #block_7] -> L [if (?)] -T-> A,  L -F-> X
//            #block_7:  E' -> B [y = x] -> C [if (y)] ... -> X'
//
// Needs: blocks, entries and edges as a client builds them; no exit nodes before
// makeProcedureAndCall, exit nodes before placeLoopAroundMain.
#include <algorithm>
#include <cstddef>

#include "ssaopt/cfg/control_flow_graph.h"
#include "ssaopt/frame/graph_algorithms.h"
#include "ssaopt/frame/report.h"
#include "ssaopt/ir/expression.h"
#include "ssaopt/ir/procedure.h"
#include "ssaopt/ir/statement.h"

using ssaopt::edge;
using ssaopt::list;
using ssaopt::nil;
using ssaopt::node;
using ssaopt::node_array;

namespace {

// Source lines of the reports, so that each report names the check that failed.
constexpr int kLineMainEntryOutdeg = 334;
constexpr int kLineCallOfUnknownProcedure = 414;
constexpr int kLineFormalsDiffer = 430;
constexpr int kLineNotABlock = 475;
constexpr int kLinePredecessorCannotCall = 524;
constexpr int kLineNoPayload = 561;
constexpr int kLineRegionOfOtherProcedure = 562;
// The name that a block would give its procedure belongs to a procedure that the block does not
// start.
constexpr int kLineNameTaken = 480;
// A block whose procedure has no call-graph node; a block of a consistent graph always has one.
constexpr int kLineCallerWithoutFcgNode = 670;
constexpr int kLineCalleeWithoutFcgNode = 675;

const char* const kProcedureNamePrefix = "#block_";

BxCXString nameOfProcedureStartingWith(const KvCBasicBlock& block) {
  return BxCXString(kProcedureNamePrefix) + BxCXString(block.getIndex(), false, true);
}

// A block right after an entry node belongs to that entry's procedure: it takes its name.
BxCXString procedureNameFor(const KvCControlFlowGraph& G, node v, const KvCBasicBlock& block) {
  for (edge e : G.in(v)) {
    KvCCfgNodeInfo* pSource = G.inf(G.source(e));
    if (pSource && pSource->isEntryNode() && pSource->getProcedure())
      return pSource->getProcedure()->getName();
  }
  return nameOfProcedureStartingWith(block);
}

// The later calls of a procedure pass the formals of the first, in the same order, possibly fewer.
bool isPrefixOfParameters(const list<KvCCfgVariable*>& formals, const list<KvCCfgParamStatement*>& params) {
  if (formals.size() > params.size()) return false;
  auto param = params.begin();
  for (KvCCfgVariable* pFormal : formals)
    if ((*param++)->getVariable() != pFormal) return false;
  return true;
}

list<KvCCfgParamStatement*> declareParameters(KvCCfgProcedure& procedure,
                                              const list<KvCCfgVariable*>& formals) {
  for (KvCCfgVariable* pFormal : formals) procedure.appendParamStatement(new KvCCfgParamStatement(pFormal));
  return procedure.getParamStatements();
}

// Pairs the first formals' statements with the arguments; a formal left without argument gets none
// for this call.
void passArguments(const list<KvCCfgParamStatement*>& params, std::size_t formalCount,
                   KvCCfgProcedureCall* pCall, const list<KvCCfgExpression*>& arguments) {
  auto param = params.begin();
  auto argument = arguments.begin();
  for (std::size_t i = 0; i < formalCount && argument != arguments.end(); ++i)
    (*param++)->setArgument(pCall, *argument++);
}

// The procedure's call-graph node, when it is one of `fcg`'s: a procedure that has left the table
// keeps a handle into an older call graph.
node fcgNodeOf(const KvCCfgProcedure* pProcedure, ssaopt::map<node, KvCCfgProcedure*>& procedureOf) {
  if (!pProcedure) return nil;
  node f = pProcedure->getFcgNode();
  KvCCfgProcedure** pMapped = procedureOf.lookup(f);
  return pMapped && *pMapped == pProcedure ? f : nil;
}

}  // namespace

// ---- The procedure table -------------------------------------------------------------------------

node KvCControlFlowGraph::demandProcedureEntryNode(const BxCXString& name, KvCCfgProcedure*& pProcedure) {
  pProcedure = findProcedure(name);
  if (!pProcedure) pProcedure = newProcedure(name);
  return pProcedure->getEntryNode();
}

// A procedure with its entry node, which has no edges yet.
KvCCfgProcedure* KvCControlFlowGraph::newProcedure(const BxCXString& name) {
  KvCCfgEntry* pEntry = new KvCCfgEntry();
  node entry = new_node(pEntry);
  KvCCfgProcedure* pProcedure = new KvCCfgProcedure();
  pProcedure->setName(name);
  pProcedure->setEntryNode(entry);
  pEntry->setProcedure(pProcedure);
  m_Procedures[name] = pProcedure;
  return pProcedure;
}

// ---- Regions become procedures -------------------------------------------------------------------

// A block that already starts the procedure it would be named after yields a call of that
// procedure and changes nothing. Everything else is checked before the first change, so that a
// refusal leaves the graph as it was.
KvCCfgProcedureCall* KvCControlFlowGraph::makeProcedureAndCall(node v) {
  if (!beginStep(ssaopt::GraphOperation::MakeProcedureAndCall)) return nullptr;
  const KvCBasicBlock* pBlock = requireBasicBlock(v, kLineNotABlock, kLineNotABlock);
  if (!pBlock) return nullptr;
  BxCXString name = procedureNameFor(*this, v, *pBlock);
  if (const KvCCfgProcedure* pExisting = findProcedure(name)) {
    if (firstBlockOf(*pExisting) == v) return new KvCCfgProcedureCall(name);
    reportInternalFault(kLineNameTaken);
    return nullptr;
  }
  if (!canBeSplitOff(v)) return nullptr;
  makeSingleEntry(splitOff(v, name));
  endStep(ssaopt::GraphOperation::MakeProcedureAndCall);
  return new KvCCfgProcedureCall(name);
}

list<node> KvCControlFlowGraph::reachableFrom(node v) {
  list<node> reached = DFS(*this, v, m_Reached);
  for (node x : reached) m_Reached[x] = false;
  return reached;
}

// The region (all that `v` reaches) and everything that enters it must be blocks or entries: the
// single-entry repetition may split off any node of the region and put calls into any of their
// predecessors. An exit node in the region is refused here, as the repetition could not split it.
bool KvCControlFlowGraph::canBeSplitOff(node v) {
  for (node x : reachableFrom(v)) {
    if (!inf(x)) {
      reportInternalFault(kLineNoPayload);
      return false;
    }
    if (!requireBasicBlock(x, kLineNotABlock, kLineNotABlock) || !predecessorsCanHoldCalls(x)) return false;
  }
  return true;
}

bool KvCControlFlowGraph::predecessorsCanHoldCalls(node v) const {
  for (edge e : in(v)) {
    KvCCfgNodeInfo* pSource = inf(source(e));
    if (!pSource || (!pSource->isEntryNode() && !pSource->isBasicBlock())) {
      reportInternalFault(kLinePredecessorCannotCall);
      return false;
    }
  }
  return true;
}

// The new procedure's entry leads to `v`, every former predecessor calls it instead, and all that
// `v` reaches moves into it.
KvCCfgProcedure* KvCControlFlowGraph::splitOff(node v, const BxCXString& name) {
  KvCCfgProcedure* pOld = inf(v)->getProcedure();
  KvCCfgProcedure* pNew = newProcedure(name);
  redirectPredecessorsToCalls(v, name);
  newPlainEdge(pNew->getEntryNode(), v);
  moveRegion(v, pOld, pNew);
  return pNew;
}

// An entry node or a branching block cannot end in a call, so the call gets a block of its own on
// that edge, in the predecessor's procedure (which, inside the single-entry repetition, is not
// necessarily the procedure of `v`). Any other predecessor ends in the call and loses the edge.
void KvCControlFlowGraph::redirectPredecessorsToCalls(node v, const BxCXString& name) {
  for (edge e : in_edges(v)) {
    node u = source(e);
    KvCBasicBlock* pCaller = getBasicBlock(u);
    if (!pCaller || pCaller->getBranchCond()) {
      node w = newBlockNode(inf(u)->getProcedure());
      move_edge(e, u, w);
      pCaller = getBasicBlock(w);
    } else {
      KvCCfgEdgeInfo* pEdgeInfo = inf(e);
      del_edge(e);
      delete pEdgeInfo;
    }
    pCaller->append(new KvCCfgProcedureCall(name));
  }
}

void KvCControlFlowGraph::moveRegion(node v, KvCCfgProcedure* pOld, KvCCfgProcedure* pNew) {
  for (node x : reachableFrom(v)) {
    KvCCfgNodeInfo* pInf = inf(x);
    KV_CONSISTENCY_CHECK(pInf->getProcedure() == pOld, "pInf->getProcedure() == pOldProcedure", kClassName,
                         kLineRegionOfOtherProcedure);
    pInf->setProcedure(pNew);
  }
}

// While a node reachable from the new entry is also entered from outside (a loop header of the
// region, typically), that node becomes a procedure of its own, and its region is made single-entry
// before the outer repetition goes on. The entries still to finish wait on an explicit stack rather
// than in nested calls, so that a deep nest of loops costs no machine stack.
//
// The repetition ends: a node split off keeps only its own entry as predecessor, so no later pass
// finds it again, and each pass deals with a different node of the original region. Each pass walks
// what the entry reaches, so a region with k such headers costs k walks.
void KvCControlFlowGraph::makeSingleEntry(KvCCfgProcedure* pProcedure) {
  ssaopt::stack<node> unfinished;
  unfinished.push(pProcedure->getEntryNode());
  while (!unfinished.empty()) {
    node header = nodeEnteredFromOutside(unfinished.top());
    if (header)
      unfinished.push(splitOffHeader(header)->getEntryNode());
    else
      unfinished.pop();
  }
}

// The first node, in the order of first visit from `entry`, with a predecessor that `entry` does not
// reach; nil when there is none.
node KvCControlFlowGraph::nodeEnteredFromOutside(node entry) {
  list<node> reached = DFS(*this, entry, m_Reached);
  auto enteredFromOutside = [this](node x) {
    for (edge e : in(x))
      if (!m_Reached[source(e)]) return true;
    return false;
  };
  auto found = std::find_if(reached.begin(), reached.end(), enteredFromOutside);
  node header = found == reached.end() ? nil : *found;
  for (node x : reached) m_Reached[x] = false;
  return header;
}

// A header is named after its own block, never after an entry node in front of it: that name would
// be the entry's procedure, the split would change nothing and the next pass would find the header
// again. The entry node, like a branching block, then gets a new block of its own procedure where
// the call stands. A header whose own name is taken (it was made a procedure before, and an edge
// into it was added since) is entered through a new empty block instead, whose index gives a fresh
// name.
KvCCfgProcedure* KvCControlFlowGraph::splitOffHeader(node header) {
  node first = header;
  while (findProcedure(nameOfProcedureStartingWith(*getBasicBlock(first))))
    first = insertEmptyBlockBefore(first);
  return splitOff(first, nameOfProcedureStartingWith(*getBasicBlock(first)));
}

node KvCControlFlowGraph::insertEmptyBlockBefore(node v) {
  node w = newBlockNode(inf(v)->getProcedure());
  while (edge e = first_in_edge(v)) move_edge(e, source(e), w);
  newPlainEdge(w, v);
  return w;
}

// ---- Call arguments ------------------------------------------------------------------------------

// The first call with formals declares the procedure's parameters; later calls must pass a prefix
// of them. A call that does not (or names no procedure of the graph) is reported and records
// nothing.
void KvCControlFlowGraph::setParametersOfCall(KvCCfgProcedureCall* pCall, list<KvCCfgVariable*>& formals,
                                              list<KvCCfgExpression*>& arguments) {
  if (!beginStep(ssaopt::GraphOperation::SetParametersOfCall)) return;
  if (KvCCfgProcedure* pCallee = findProcedure(pCall->getName())) {
    list<KvCCfgParamStatement*> params = pCallee->getParamStatements();
    if (params.empty()) params = declareParameters(*pCallee, formals);
    if (isPrefixOfParameters(formals, params))
      passArguments(params, formals.size(), pCall, arguments);
    else
      reportInternalFault(kLineFormalsDiffer);
  } else {
    reportInternalFault(kLineCallOfUnknownProcedure);
  }
  formals.clear();
  arguments.clear();
}

// ---- Exit nodes and the loop around "#main" ------------------------------------------------------

// One exit node per component, joined from every dead end of the component. A procedure that never
// reaches its end gets an exit node without in-edges.
void KvCControlFlowGraph::placeExitNodes() {
  if (!beginStep(ssaopt::GraphOperation::PlaceExitNodes)) return;
  node_array<int> component;
  int count = COMPONENTS(*this, component);
  ssaopt::array<node> exitOf(static_cast<std::size_t>(count));
  for (node& exit : exitOf) exit = new_node(new KvCCfgExit());
  for (node v : nodes())
    if (isDeadEnd(v)) newPlainEdge(v, exitOf[static_cast<std::size_t>(component[v])]);
  for (const auto& named : m_Procedures) {
    KvCCfgProcedure* pProcedure = named.second;
    node exit = exitOf[static_cast<std::size_t>(component[pProcedure->getEntryNode()])];
    inf(exit)->setProcedure(pProcedure);
    pProcedure->setExitNode(exit);
  }
  endStep(ssaopt::GraphOperation::PlaceExitNodes);
}

bool KvCControlFlowGraph::isDeadEnd(node v) const {
  KvCCfgNodeInfo* pInf = inf(v);
  return outdeg(v) == 0 && !(pInf && pInf->isExitNode());
}

// Every path that ends "#main" passes a block with an undetermined condition that starts the body
// again or leaves. A body that never reaches its exit gets no such block, as nothing would enter it;
// without "#main", its first block or its exit node there is nothing to close.
void KvCControlFlowGraph::placeLoopAroundMain() {
  if (!beginStep(ssaopt::GraphOperation::PlaceLoopAroundMain)) return;
  KvCCfgProcedure* pMain = findProcedure(kMainProcedureName);
  if (!pMain) return;
  KV_CONSISTENCY_CHECK(outdeg(pMain->getEntryNode()) == 1, "outdeg(EntryNode) == 1", kClassName,
                       kLineMainEntryOutdeg);
  node first = firstBlockOf(*pMain);
  node exit = pMain->getExitNode();
  if (!first || !exit || indeg(exit) == 0) return;
  node loop = newBlockNode(pMain);
  getBasicBlock(loop)->appendBranch(new KvCCfgValueExpression());
  while (edge e = first_in_edge(exit)) move_edge(e, source(e), loop);
  new_edge(loop, first, new KvCCfgTrueBranch());
  new_edge(loop, exit, new KvCCfgFalseBranch());
  endStep(ssaopt::GraphOperation::PlaceLoopAroundMain);
}

// ---- The function call graph ---------------------------------------------------------------------

// A call of a procedure without call-graph node (or from a block without one) is reported and left
// out; the edges of all other calls are still added, so the summaries miss as little as possible.
void KvCControlFlowGraph::buildFunctionCallGraph(ssaopt::graph& fcg,
                                                 ssaopt::map<node, KvCCfgProcedure*>& procedureOf) {
  node_array<int> dist(*this, -1);
  for (const auto& named : m_Procedures) {
    KvCCfgProcedure* pProcedure = named.second;
    node f = fcg.new_node();
    pProcedure->setFcgNode(f);
    procedureOf[f] = pProcedure;
    claimReachableNodes(pProcedure, dist);
  }
  for (node v : nodes())
    if (const KvCBasicBlock* pBlock = getBasicBlock(v)) addCallEdges(*pBlock, fcg, procedureOf);
}

// Ownership follows reachability: a node reachable from two entries ends with the later procedure
// in name order. The distances are set back to -1 behind the search, so that every search sees the
// whole graph unvisited while, in a consistent graph, the procedures together cost one pass over it.
void KvCControlFlowGraph::claimReachableNodes(KvCCfgProcedure* pProcedure, node_array<int>& dist) {
  for (node x : BFS(*this, pProcedure->getEntryNode(), dist)) {
    dist[x] = -1;
    if (KvCCfgNodeInfo* pInf = inf(x)) pInf->setProcedure(pProcedure);
  }
}

// One edge per call of another procedure, parallel edges included; a call of the caller itself
// gets none.
void KvCControlFlowGraph::addCallEdges(const KvCBasicBlock& block, ssaopt::graph& fcg,
                                       ssaopt::map<node, KvCCfgProcedure*>& procedureOf) const {
  node caller = fcgNodeOf(block.getProcedure(), procedureOf);
  for (KvCCfgStatement* pStatement : block.getStatementSeq()) {
    const KvCCfgProcedureCall* pCall = pStatement->isProcedureCall();
    if (!pCall) continue;
    node callee = fcgNodeOf(findProcedure(pCall->getName()), procedureOf);
    if (!caller)
      reportInternalFault(kLineCallerWithoutFcgNode);
    else if (!callee)
      reportInternalFault(kLineCalleeWithoutFcgNode);
    else if (callee != caller)
      fcg.new_edge(caller, callee);
  }
}

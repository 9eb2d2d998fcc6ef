// The verifier: every invariant that the steps keep, checked from the graph as it stands and reported
// violation by violation. It reads what the graph's state says has happened (SSA form, use sets kept
// up to date) to know which invariants hold.
//
//   x.2 = 1;  if (c.1) goto A else B;  A: y.1 = x.3;  ...  x.3 = phi(x.2, x.4)
//   verify(): "every use is dominated by its definition: node 9 reads version 41 (of variable 7),
//             defined at node 12, which does not dominate it"
//
// Dominators are computed once (Lengauer and Tarjan) and numbered in preorder and postorder of the
// dominator tree, so that each dominance question is two comparisons; the rest is one walk over the
// nodes, statements and edges. Needs nothing of the graph's state.
#include <cstdarg>
#include <cstdio>
#include <string>
#include <unordered_map>
#include <unordered_set>

#include "graph_mechanism.h"
#include "ssaopt/cfg/control_flow_graph.h"
#include "ssaopt/frame/graph_algorithms.h"
#include "ssaopt/frame/report.h"
#include "ssaopt/ir/expression.h"
#include "ssaopt/ir/node_info.h"
#include "ssaopt/ir/procedure.h"
#include "ssaopt/ir/statement.h"
#include "ssaopt/ir/variable.h"

using ssaopt::array;
using ssaopt::edge;
using ssaopt::GraphFact;
using ssaopt::nil;
using ssaopt::node;
using ssaopt::node_array;

namespace {

// The "source line" of each kind of violation, so that a report names the check that failed.
enum Check : int {
  kPayloads = 5000,
  kComponents = 5001,       // invariant 1: one component per procedure
  kEntryAlone = 5002,       // invariant 2: the entry is the only node without in-edges
  kProcedureOfNode = 5003,  // invariant 3
  kEntryEdge = 5004,        // invariant 4: one out-edge, to the first block
  kBranchEdges = 5005,      // invariant 5
  kCallsApart = 5006,       // invariant 6
  kExits = 5007,            // once placed: every procedure left at its exit node
  kSSAEdgeOrder = 5008,     // SSA out-edges after the control-flow out-edges, between blocks
  kOneDefinition = 5009,    // one definition per version
  kPhiOperands = 5010,      // one operand per control-flow in-edge of the chain's first node
  kDominance = 5011,        // every use dominated by its definition
  kUseSets = 5012,          // use sets match the statements
};

// A verifier that finds a graph broken everywhere reports this many violations and then only counts.
constexpr int kMaxReports = 100;

// Where a statement stands: its node, and its place there (phi functions first, then statements, then
// the condition).
struct Place {
  node at;
  int position;
};

constexpr int kEndOfBlock = 1 << 30;

template <class K, class V>
using HashMap =
    std::unordered_map<K, V, std::hash<K>, std::equal_to<K>, ssaopt::ModuleAllocator<std::pair<const K, V>>>;

// A variable read at a node, as one key: the node's creation number beside the variable's address.
struct Reading {
  const KvCCfgVariable* pVariable;
  std::uint32_t node;
  bool operator==(const Reading& other) const { return pVariable == other.pVariable && node == other.node; }
};
struct ReadingHash {
  std::size_t operator()(const Reading& reading) const {
    return std::hash<const void*>()(reading.pVariable) * 31 + reading.node;
  }
};
using Readings =
    std::unordered_set<Reading, ReadingHash, std::equal_to<Reading>, ssaopt::ModuleAllocator<Reading>>;

std::string nameOf(const KvCCfgProcedure* pProcedure) {
  return pProcedure ? pProcedure->getName().cstring() : "(none)";
}

// "version 41 of variable 7", or "variable 7" for a variable without versions.
std::string variableText(KvCCfgVariable* pVariable) {
  if (!pVariable) return "no variable";
  KvCSSAVariable* pVersion = pVariable->isSSAVariable();
  std::string variable =
      "variable " + std::to_string(pVersion ? pVersion->getOrigVar()->getIndex() : pVariable->getIndex());
  return pVersion ? "version " + std::to_string(pVersion->getIndex()) + " of " + variable : variable;
}

}  // namespace

class KvCControlFlowGraph::Verifier {
public:
  explicit Verifier(const KvCControlFlowGraph& G)
      : m_G(G),
        m_Alive(G, false),
        m_Owner(G, nullptr),
        m_Pre(G, -1),
        m_Post(G, -1),
        m_Reachable(G, false),
        m_Head(G, nil) {
    for (node v : G.nodes()) m_Alive[v] = true;
  }

  bool run() {
    numberComponents();
    checkProcedures();
    for (node v : m_G.nodes()) checkNode(v);
    if (m_G.getState().has(GraphFact::SSAForm)) checkSSAForm();
    if (m_G.getState().has(GraphFact::UseSets)) checkUseSets();
    if (m_Violations > kMaxReports) {
      char text[96];
      std::snprintf(text, sizeof text, "verify: %d further violations not shown", m_Violations - kMaxReports);
      ssaopt::reportConsistencyFailure(ssaopt::cfg::kGraphClass, kPayloads, text);
    }
    return m_Violations == 0;
  }

private:
  // ---- Reports -----------------------------------------------------------------------------------

#if defined(__GNUC__)
  __attribute__((format(printf, 3, 4)))
#endif
  void
  violation(Check check, const char* format, ...) {
    if (++m_Violations > kMaxReports) return;
    char text[512];
    std::va_list args;
    va_start(args, format);
    std::vsnprintf(text, sizeof text, format, args);
    va_end(args);
    ssaopt::reportConsistencyFailure(ssaopt::cfg::kGraphClass, check, text);
  }

  // "node 52 (bb31)", with the name the printer gives the block, or what else the node is.
  std::string nodeText(node v) const {
    std::string text = "node " + std::to_string(v.index());
    if (!m_Alive[v]) return text + " (deleted)";
    KvCCfgNodeInfo* pInf = m_G.inf(v);
    if (KvCBasicBlock* pBlock = pInf ? pInf->isBasicBlock() : nullptr)
      return text + " (bb" + std::to_string(pBlock->getIndex()) + ")";
    if (pInf && pInf->isEntryNode())
      return text + " (the entry of '" + nameOf(pInf->getProcedure()).c_str() + "')";
    if (pInf && pInf->isExitNode())
      return text + " (the exit of '" + nameOf(pInf->getProcedure()).c_str() + "')";
    return text;
  }

  // ---- Invariants 1 to 6, and the exits ----------------------------------------------------------

  void numberComponents() {
    node_array<int> component;
    int count = COMPONENTS(m_G, component, [this](edge e) { return m_G.isControlFlowEdge(e); });
    array<KvCCfgProcedure*> ownerOf(static_cast<std::size_t>(count), nullptr);
    for (const auto& named : m_G.m_Procedures) {
      KvCCfgProcedure* pProcedure = named.second;
      node entry = pProcedure->getEntryNode();
      KvCCfgNodeInfo* pInf = entry ? m_G.inf(entry) : nullptr;
      if (!pInf || !pInf->isEntryNode() || pInf->getProcedure() != pProcedure) {
        violation(kComponents, "one component per procedure: '%s' has no entry node of its own",
                  nameOf(pProcedure).c_str());
        continue;
      }
      KvCCfgProcedure*& owner = ownerOf[static_cast<std::size_t>(component[entry])];
      if (owner)
        violation(kComponents, "one component per procedure: '%s' and '%s' are connected",
                  nameOf(owner).c_str(), nameOf(pProcedure).c_str());
      else
        owner = pProcedure;
    }
    array<bool> reported(ownerOf.size(), false);
    for (node v : m_G.nodes()) {
      std::size_t c = static_cast<std::size_t>(component[v]);
      m_Owner[v] = ownerOf[c];
      if (!ownerOf[c] && !reported[c]) {
        reported[c] = true;
        violation(kComponents, "one component per procedure: %s lies in a component without procedure",
                  nodeText(v).c_str());
      }
    }
  }

  void checkProcedures() {
    bool exitsPlaced = m_G.getState().has(GraphFact::ExitsPlaced);
    for (const auto& named : m_G.m_Procedures) {
      const KvCCfgProcedure* pProcedure = named.second;
      node entry = pProcedure->getEntryNode();
      if (!entry || m_Owner[entry] != pProcedure) continue;
      checkEntry(*pProcedure, entry);
      if (exitsPlaced) checkExit(*pProcedure);
    }
  }

  void checkEntry(const KvCCfgProcedure& procedure, node entry) {
    if (m_G.indeg(entry) != 0)
      violation(kEntryAlone, "the entry is the only node without in-edges: the entry of '%s' has %d in-edges",
                nameOf(&procedure).c_str(), m_G.indeg(entry));
    if (m_G.outdeg(entry) != 1 || !m_G.getBasicBlock(m_G.target(m_G.first_adj_edge(entry))))
      violation(kEntryEdge,
                "the entry has one out-edge, to the first block: the entry of '%s' has %d out-edges",
                nameOf(&procedure).c_str(), m_G.outdeg(entry));
  }

  void checkExit(const KvCCfgProcedure& procedure) {
    node exit = procedure.getExitNode();
    KvCCfgNodeInfo* pInf = exit ? m_G.inf(exit) : nullptr;
    if (!pInf || !pInf->isExitNode() || m_Owner[exit] != &procedure ||
        !m_G.getControlFlowOutEdges(exit).empty())
      violation(kExits, "every procedure ends at its exit node: '%s' has no exit node of its own",
                nameOf(&procedure).c_str());
  }

  bool hasControlFlowInEdge(node v) const {
    for (edge e : m_G.in(v))
      if (m_G.isControlFlowEdge(e)) return true;
    return false;
  }

  void checkNode(node v) {
    KvCCfgNodeInfo* pInf = m_G.inf(v);
    const KvCCfgProcedure* pOwner = m_Owner[v];
    if (!pInf) {
      violation(kPayloads, "every node carries a payload: %s carries none", nodeText(v).c_str());
      return;
    }
    if (!pOwner) return;
    if (pInf->getProcedure() != pOwner)
      violation(kProcedureOfNode,
                "a node belongs to the procedure of its component: %s belongs to '%s', "
                "its component to '%s'",
                nodeText(v).c_str(), nameOf(pInf->getProcedure()).c_str(), nameOf(pOwner).c_str());
    if (v != pOwner->getEntryNode() && !hasControlFlowInEdge(v))
      violation(kEntryAlone, "the entry is the only node without in-edges: %s of '%s' has none too",
                nodeText(v).c_str(), nameOf(pOwner).c_str());
    checkOutEdges(v, pInf->isBasicBlock(), *pOwner);
    if (KvCBasicBlock* pBlock = pInf->isBasicBlock()) checkCalls(v, *pBlock);
  }

  // Dead-code elimination may take the branch that a constant condition never takes; then the block
  // keeps one of its two branch edges.
  void checkOutEdges(node v, const KvCBasicBlock* pBlock, const KvCCfgProcedure& owner) {
    int trueEdges = 0, falseEdges = 0, plainEdges = 0;
    bool afterSSAEdge = false;
    for (edge e : m_G.out(v)) {
      KvCCfgEdgeInfo* pInfo = m_G.inf(e);
      if (!pInfo) {
        violation(kPayloads, "every edge carries a payload: edge %u from %s carries none", e.index(),
                  nodeText(v).c_str());
        continue;
      }
      if (pInfo->isSSAEdge()) {
        afterSSAEdge = true;
        if (!pBlock || !m_G.getBasicBlock(m_G.target(e)))
          violation(kSSAEdgeOrder, "SSA edges join blocks: edge %u from %s to %s", e.index(),
                    nodeText(v).c_str(), nodeText(m_G.target(e)).c_str());
        continue;
      }
      if (afterSSAEdge)
        violation(kSSAEdgeOrder, "SSA out-edges follow the control-flow out-edges: %s has edge %u after them",
                  nodeText(v).c_str(), e.index());
      trueEdges += pInfo->isTrueBranch() != nullptr;
      falseEdges += pInfo->isFalseBranch() != nullptr;
      plainEdges += !pInfo->isTrueBranch() && !pInfo->isFalseBranch();
    }
    checkBranchEdges(v, pBlock && pBlock->getBranchCond(), trueEdges, falseEdges, plainEdges);
    bool exitsPlaced = m_G.getState().has(GraphFact::ExitsPlaced);
    if (exitsPlaced && v != owner.getExitNode() && trueEdges + falseEdges + plainEdges == 0)
      violation(kExits, "every procedure ends at its exit node: %s of '%s' ends it too", nodeText(v).c_str(),
                nameOf(&owner).c_str());
  }

  void checkBranchEdges(node v, bool branching, int trueEdges, int falseEdges, int plainEdges) {
    bool takenRemoved = m_G.getState().has(GraphFact::Propagated);
    bool holds = branching
                     ? plainEdges == 0 && trueEdges <= 1 && falseEdges <= 1 && trueEdges + falseEdges >= 1 &&
                           (takenRemoved || (trueEdges == 1 && falseEdges == 1))
                     : trueEdges + falseEdges == 0;
    if (!holds)
      violation(kBranchEdges,
                "a block with a condition has a true and a false out-edge, all other control flow is "
                "plain: %s has %d true, %d false and %d plain out-edges%s",
                nodeText(v).c_str(), trueEdges, falseEdges, plainEdges, branching ? "" : " and no condition");
  }

  void checkCalls(node v, const KvCBasicBlock& block) {
    for (KvCCfgStatement* pStatement : block.getStatementSeq()) {
      KvCCfgProcedureCall* pCall = pStatement->isProcedureCall();
      if (!pCall) continue;
      const KvCCfgProcedure* pCallee = m_G.findProcedure(pCall->getName());
      if (!pCallee)
        violation(kCallsApart, "a call names a procedure of the graph: %s calls '%s'", nodeText(v).c_str(),
                  pCall->getName().cstring());
      else if (pCallee != m_Owner[v] && m_Owner[pCallee->getEntryNode()] == m_Owner[v])
        violation(kCallsApart, "the calling block does not connect to the callee: %s calls '%s'",
                  nodeText(v).c_str(), nameOf(pCallee).c_str());
    }
  }

  // ---- SSA form ----------------------------------------------------------------------------------

  void checkSSAForm() {
    for (const auto& named : m_G.m_Procedures)
      for (KvCCfgValueReturnStatement* pReturn : named.second->getValueReturnStatements())
        m_CalleeOfReturn[pReturn] = named.second;
    for (node v : m_G.nodes())
      if (const KvCBasicBlock* pBlock = m_G.getBasicBlock(v)) collectDefinitions(v, *pBlock);
    findPhiChainHeads();
    numberDominatorTree();
    for (node v : m_G.nodes())
      if (const KvCBasicBlock* pBlock = m_G.getBasicBlock(v); pBlock && m_Owner[v]) checkUsesAt(v, *pBlock);
  }

  void collectDefinitions(node v, const KvCBasicBlock& block) {
    int position = 0;
    for (KvCPhiFunction* pPhi : block.getPhiFunctions()) define(pPhi->getVariable(), {v, position++});
    for (KvCCfgStatement* pStatement : block.getStatementSeq()) {
      for (KvCCfgVariable* pVariable : pStatement->getDefinedVariables()) define(pVariable, {v, position});
      if (KvCCfgProcedureCall* pCall = pStatement->isProcedureCall()) m_CallSites[pCall] = {v, position};
      ++position;
    }
  }

  void define(KvCCfgVariable* pVariable, Place place) {
    if (!pVariable || !pVariable->isSSAVariable()) {
      violation(kOneDefinition, "every definition defines a version: %s defines %s",
                nodeText(place.at).c_str(), pVariable ? "a variable without version" : "nothing");
      return;
    }
    auto inserted = m_Definitions.emplace(pVariable, place);
    if (!inserted.second)
      violation(kOneDefinition, "one definition per version: %s is defined at %s and at %s",
                variableText(pVariable).c_str(), nodeText(inserted.first->second.at).c_str(),
                nodeText(place.at).c_str());
  }

  // Every piece of a chain of one-phi blocks has the piece before it as its only predecessor, so a
  // walk back from any piece whose head is not known yet settles all pieces it passes.
  void findPhiChainHeads() {
    array<node> path;
    for (node v : m_G.nodes()) {
      const KvCBasicBlock* pBlock = m_G.getBasicBlock(v);
      if (!pBlock || pBlock->getPhiFunctions().empty() || m_Head[v]) continue;
      node head = v;
      for (;;) {
        path.push_back(head);
        array<edge> in = m_G.getControlFlowInEdges(head);
        if (in.size() != 1 || !m_G.isPhiChainLink(in[0])) break;
        head = m_G.source(in[0]);
        if (m_Head[head]) {
          head = m_Head[head];
          break;
        }
      }
      for (node piece : path) m_Head[piece] = head;
      path.clear();
    }
  }

  // Preorder and postorder numbers of the dominator tree; only nodes that their entry reaches take part.
  void numberDominatorTree() {
    node_array<node> idom(m_G, nil);
    m_G.computeControlFlowIdoms(idom);
    node_array<node> firstChild(m_G, nil), nextSibling(m_G, nil);
    for (node v : m_G.nodes())
      if (node parent = idom[v]) {
        nextSibling[v] = firstChild[parent];
        firstChild[parent] = v;
      }
    int counter = 0;
    array<node> stack;
    for (const auto& named : m_G.m_Procedures) {
      node entry = named.second->getEntryNode();
      if (!entry || m_Pre[entry] >= 0) continue;
      stack.push_back(entry);
      while (!stack.empty()) {
        node v = stack.back();
        if (m_Pre[v] < 0) {
          m_Pre[v] = counter++;
          m_Reachable[v] = true;
          for (node child = firstChild[v]; child; child = nextSibling[child]) stack.push_back(child);
        } else {
          stack.pop_back();
          m_Post[v] = counter++;
        }
      }
    }
  }

  bool dominates(node d, node u) const {
    return m_Reachable[d] && m_Pre[d] <= m_Pre[u] && m_Post[u] <= m_Post[d];
  }

  void checkUsesAt(node v, const KvCBasicBlock& block) {
    if (!block.getPhiFunctions().empty()) checkPhiFunctionsAt(v, block);
    int position = static_cast<int>(block.getPhiFunctions().size());
    for (KvCCfgStatement* pStatement : block.getStatementSeq()) {
      if (KvCCfgParamStatement* pParam = pStatement->isParamStatement()) {
        checkArguments(*pParam);
      } else if (KvCCfgValueReturnStatement* pReturn = pStatement->isValueReturnStatement()) {
        checkValueReturn(v, *pReturn);
      } else {
        for (KvCCfgVariable* pRead : pStatement->getUsedVariables()) requireDominated(pRead, {v, position});
      }
      ++position;
    }
    if (KvCCfgExpression* pCond = block.getBranchCond())
      for (KvCCfgVariable* pRead : pCond->getUsedVariables()) requireDominated(pRead, {v, position});
  }

  // Operand i is read at the end of the predecessor that in-edge i of the chain's first node comes from.
  void checkPhiFunctionsAt(node v, const KvCBasicBlock& block) {
    array<edge> in = m_G.getControlFlowInEdges(m_Head[v]);
    for (KvCPhiFunction* pPhi : block.getPhiFunctions()) {
      array<KvCCfgVariable*> operands = pPhi->getReplacementVariables();
      if (operands.size() != in.size()) {
        violation(kPhiOperands,
                  "a phi function has one operand per control-flow in-edge: the phi function of "
                  "%s at %s has %zu operands for %zu in-edges of %s",
                  variableText(pPhi->getVariable()).c_str(), nodeText(v).c_str(), operands.size(), in.size(),
                  nodeText(m_Head[v]).c_str());
        continue;
      }
      for (std::size_t i = 0; i < operands.size(); ++i)
        requireDominated(operands[i], {m_G.source(in[i]), kEndOfBlock});
    }
  }

  // A call's arguments are read where the call stands, in the caller.
  void checkArguments(const KvCCfgParamStatement& param) {
    for (const auto& argument : param.getArguments()) {
      auto site = m_CallSites.find(argument.first);
      if (site == m_CallSites.end()) {
        violation(kDominance,
                  "every argument belongs to a call of the graph: the parameter of %s keeps one "
                  "of a call that is gone",
                  variableText(param.getVariable()).c_str());
        continue;
      }
      if (argument.second)
        for (KvCCfgVariable* pRead : argument.second->getUsedVariables())
          requireDominated(pRead, site->second);
    }
  }

  // A value return reads what the callee leaves at its exit.
  void checkValueReturn(node v, const KvCCfgValueReturnStatement& valueReturn) {
    auto callee = m_CalleeOfReturn.find(&valueReturn);
    if (callee == m_CalleeOfReturn.end()) {
      violation(kDominance, "every value return belongs to a procedure: %s holds one that none lists",
                nodeText(v).c_str());
      return;
    }
    for (KvCCfgVariable* pRead : valueReturn.getUsedVariables())
      requireDominated(pRead, {callee->second->getExitNode(), kEndOfBlock});
  }

  void requireDominated(KvCCfgVariable* pRead, Place use) {
    if (!pRead || !pRead->isSSAVariable()) {
      violation(kDominance, "every use reads a version: %s reads %s", nodeText(use.at).c_str(),
                pRead ? "a variable without version" : "nothing");
      return;
    }
    auto definition = m_Definitions.find(pRead);
    if (definition == m_Definitions.end()) {
      violation(kDominance,
                "every use is dominated by its definition: %s reads %s, which nothing "
                "defines",
                nodeText(use.at).c_str(), variableText(pRead).c_str());
      return;
    }
    Place def = definition->second;
    if (!use.at || !m_Reachable[use.at]) return;
    if (m_Owner[def.at] != m_Owner[use.at]) {
      violation(kDominance, "every use is dominated by its definition: %s of '%s' reads %s of '%s'",
                nodeText(use.at).c_str(), nameOf(m_Owner[use.at]).c_str(), variableText(pRead).c_str(),
                nameOf(m_Owner[def.at]).c_str());
      return;
    }
    bool holds = def.at == use.at ? def.position < use.position : dominates(def.at, use.at);
    if (!holds)
      violation(kDominance,
                "every use is dominated by its definition: %s reads %s, defined at %s, "
                "which does not dominate it",
                nodeText(use.at).c_str(), variableText(pRead).c_str(), nodeText(def.at).c_str());
  }

  // ---- Use sets ----------------------------------------------------------------------------------

  // The steps keep the use sets of the variables that some node assigns: each names exactly the nodes
  // whose payload reads the variable. Both directions at once: every node a set names reads the
  // variable, and the set names as many nodes as read it.
  void checkUseSets() {
    HashMap<const KvCCfgVariable*, int> readers;
    Readings readings;
    for (node v : m_G.nodes())
      if (KvCCfgNodeInfo* pInf = m_G.inf(v))
        for (KvCCfgVariable* pRead : pInf->getUsedVariables()) {
          readings.insert({pRead, v.index()});
          ++readers[pRead];
        }
    ssaopt::set<KvCCfgVariable*> assigned;
    for (node v : m_G.nodes())
      if (const KvCBasicBlock* pBlock = m_G.getBasicBlock(v)) insertDefinedVariables(*pBlock, assigned);
    for (KvCCfgVariable* pVariable : assigned) checkUseSetOf(*pVariable, readings, readers[pVariable]);
  }

  static void insertDefinedVariables(const KvCBasicBlock& block, ssaopt::set<KvCCfgVariable*>& into) {
    for (KvCPhiFunction* pPhi : block.getPhiFunctions()) into.insert(pPhi->getVariable());
    for (KvCCfgStatement* pStatement : block.getStatementSeq())
      ssaopt::insertAll(into, pStatement->getDefinedVariables());
  }

  void checkUseSetOf(KvCCfgVariable& variable, const Readings& readings, int readers) {
    for (node user : variable.getUses())
      if (!readings.count({&variable, user.index()})) {
        violation(kUseSets,
                  "use sets match the statements: the use set of %s names %s, which does "
                  "not read it",
                  variableText(&variable).c_str(), nodeText(user).c_str());
        return;
      }
    if (variable.countUses() != readers)
      violation(kUseSets, "use sets match the statements: the use set of %s names %d nodes, %d read it",
                variableText(&variable).c_str(), variable.countUses(), readers);
  }

  const KvCControlFlowGraph& m_G;
  int m_Violations = 0;
  node_array<bool> m_Alive;                    // use sets may name nodes that are gone
  node_array<const KvCCfgProcedure*> m_Owner;  // the procedure of the node's component
  node_array<int> m_Pre, m_Post;               // numbers in the dominator tree
  node_array<bool> m_Reachable;                // from the entry of its procedure
  node_array<node> m_Head;                     // the first node of the phi chain the node lies on
  HashMap<const KvCCfgVariable*, Place> m_Definitions;
  HashMap<const KvCCfgProcedureCall*, Place> m_CallSites;
  HashMap<const KvCCfgValueReturnStatement*, const KvCCfgProcedure*> m_CalleeOfReturn;
};

bool KvCControlFlowGraph::verify() const { return Verifier(*this).run(); }

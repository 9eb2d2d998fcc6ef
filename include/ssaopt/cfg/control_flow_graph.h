// The control-flow graph of a whole program. Every procedure is one connected component of this one
// graph, entered at its entry node and, once exits are placed, left at its exit node; a call is a
// statement naming its procedure, never an edge into it. Nodes carry KvCCfgNodeInfo payloads (blocks,
// entries, exits) and edges KvCCfgEdgeInfo payloads (plain, true and false branches, SSA edges).
//
// Invariants that every transformation keeps (checkConsistency verifies the first three, verify all
// of them and those of SSA form):
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

#include <functional>

#include "ssaopt/cfg/graph_state.h"
#include "ssaopt/frame/containers.h"
#include "ssaopt/frame/graph.h"
#include "ssaopt/frame/string.h"
#include "ssaopt/ir/edge_info.h"
#include "ssaopt/ir/forward.h"
#include "ssaopt/ir/node_info.h"

namespace ssaopt {

// A procedure and its blocks in program order (KvCControlFlowGraph::getProgramOrder).
struct ProcedureBlocks {
  KvCCfgProcedure* pProcedure;
  array<node> blocks;
};

}  // namespace ssaopt

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

  // ---- The graph's state and its verifier (step_checks.cpp, verifier.cpp) ---------------------

  // Which steps have run, as far as the steps rely on it (see graph_state.h). Every public step
  // checks it on entry and keeps it up to date.
  ssaopt::GraphState getState() const { return m_State; }
  // For a client that builds the graph in a later form by hand (already in SSA form, already
  // divided): the steps take its word for it.
  void setState(ssaopt::GraphState state) { m_State = state; }
  // Why `operation` cannot run on the graph now, naming the step and what is missing; empty when it
  // can. A step called anyway reports this as an internal error and changes nothing.
  BxCXString checkReadiness(ssaopt::GraphOperation operation) const;
  // Checks the six invariants above and, in SSA form, that every version has one definition, that
  // every use is dominated by its definition (an argument at its call, a value return at the
  // callee's exit), that every phi function has one operand per control-flow in-edge of its block
  // (of the first block of its chain once divided), that SSA out-edges follow the control-flow
  // out-edges, and that use sets match the statements where the steps keep them. Reports every
  // violation as a failed consistency condition, whatever ShowInternalInfo() says, and returns
  // whether there was none. Near-linear in the size of the graph; changes nothing.
  bool verify() const;

  // ---- Reading the graph back (reading.cpp) ----------------------------------------------------

  // Whether `e` is control flow: not an SSA edge.
  bool isControlFlowEdge(ssaopt::edge e) const {
    KvCCfgEdgeInfo* pInfo = inf(e);
    return !pInfo || !pInfo->isSSAEdge();
  }
  // The control-flow out-edges and in-edges of `v`, in adjacency order.
  ssaopt::array<ssaopt::edge> getControlFlowOutEdges(ssaopt::node v) const;
  ssaopt::array<ssaopt::edge> getControlFlowInEdges(ssaopt::node v) const;
  // Whether exactly one control-flow edge enters `v`; stops at the second, so a join of many
  // branches costs little to ask.
  bool hasOneControlFlowInEdge(ssaopt::node v) const;
  // The node whose control-flow in-edges the operands of the phi functions of `v` belong to: `v`
  // itself, or after divideBasicBlock the first node of the chain of one-phi blocks that `v` lies
  // on (its blocks may since have been emptied by removeUnusedVarDefs). Costs the length of the
  // chain before `v`.
  ssaopt::node getPhiChainHead(ssaopt::node v) const;
  // The in-edges that the operands of the phi functions of `v` belong to, in operand order.
  ssaopt::array<ssaopt::edge> getPhiOperandEdges(ssaopt::node v) const;
  // Every procedure with its blocks in program order: procedures in the order of their entry nodes;
  // within one, its first block, then chains of blocks in node order, each block followed by the
  // block it falls into when nothing else enters that one (so the pieces of a divided or split block
  // stay together, and a join stays where the client put it). Only blocks for which `isShown` is
  // true take part (all when it is empty); a chain ends before any other.
  ssaopt::array<ssaopt::ProcedureBlocks> getProgramOrder(
      const std::function<bool(ssaopt::node)>& isShown = nullptr) const;

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
  // Appends every call of the graph that no procedure's call list holds yet to its procedure's list,
  // so that each call is registered before transformToSSAForm, which needs them all (call_lists.cpp).
  void completeCallLists();

  // ---- SSA construction and the optimisations join here, each in a source file of its own ------

  // ---- SSA construction: dominators (dominators.cpp) -------------------------------------------

  // Sets the immediate dominator of every node: nil for the node without in-edges that roots each
  // component, and for every node that such a root does not reach.
  void computeAllIdoms();
  // Fills the dominance frontier of every node; needs computeAllIdoms and the trees built after it.
  void computeDominanceFrontiers(ssaopt::array<KvCDominatorTree*>& trees);

  // ---- SSA construction: phi placement and the SSA driver (ssa.cpp) ----------------------------

  // Puts the whole program, all procedures at once, into SSA form: interface statements between the
  // procedures, phi functions, and one new version per definition. A graph is transformed once.
  void transformToSSAForm();
  // Places phi functions at the iterated dominance frontier of every assigned variable; needs the
  // frontiers. An exit node that needs one becomes a block followed by a new exit node.
  void placePhiFunction();

  // ---- Sparse conditional constant propagation (constant_propagation.cpp) ----------------------

  // Adds the SSA def-use edges, then propagates lattice values, value ranges and executable edges
  // over every procedure in passes; with `removeDeadCode`, removes after each pass what it did not
  // reach. The SSA edges stay until hoisting deletes them. Needs SSA form and divided blocks.
  void propagateSparseConditionalConstant(bool removeDeadCode);
  // Rebuilds the use sets and adds one SSA edge per defining node, defined variable and using node,
  // beside any SSA edges already there.
  void addSSAEdges();
  // The propagation alone, over the SSA edges present and the use sets as they are. Afterwards the
  // executable flags are those of the procedure processed last (in name order), while the visited
  // marks gather what the last pass reached in every procedure.
  void sparseConditionalConstant(bool removeDeadCode);

  // ---- Constant substitution, folding and unused definitions (substitution.cpp) ---------------

  // Lets the right-hand side of every assignment, and every branch condition, put constants in
  // place of the variables that propagation found constant.
  void replaceConstantVariables();
  // Lets every branch condition replace itself by its constant outcome where it has one.
  void replaceConstantConditions();
  // Lets every assignment and branch condition fold its constant parts.
  void foldConstants();
  // Deletes, until none is left, the phi functions and statements of divided blocks that define an
  // erasable, non-array variable that nothing reads, when they have no side effects.
  void removeUnusedVarDefs();

  // ---- Procedure inlining (inlining.cpp) -------------------------------------------------------

  // Registers every call of the graph in its procedure's call list, then puts the body of each
  // procedure called from exactly one place (never "#main", never from inside itself) in place of its
  // call, its parameters becoming initialisation assignments in a new block before the body; the
  // procedure leaves the table. Expects exit nodes placed and each call alone in a block with one
  // successor; a call that is not is reported (while internal information is on) and stays.
  void inlineProcedures();

  // ---- Valid-condition assignments (valid_conditions.cpp) --------------------------------------

  // On the branch edges of every block whose condition tests a variable, places a new block holding
  // a virtual assignment of the value that the variable has on that branch. A logical variable
  // compared with a constant other than 0 and 1 gets no assignment: its condition is told so and
  // becomes the constant outcome. Runs before transformToSSAForm.
  void insertValidConditionAssignments();

  // ---- Code hoisting (hoisting.cpp) ------------------------------------------------------------

  // Deletes the SSA edges, then at every branch offers the statement classes the statements at the
  // heads of both branches, pair after pair, to move one of each matching pair before the branch and
  // drop the other.
  void hoistCodeOutOfIfElseBranches();

private:
  // The steps' named private operations are members; each step's further helpers are functions of
  // its source file (src/cfg/), and what a step keeps while it runs is a class of its own, declared
  // here for its access to the graph and defined in the step's source.
  friend class KvCControlFlowGraphTestAccess;
  friend class KvCControlFlowGraphSSATestAccess;

  // ---- The graph's state (step_checks.cpp) and its verifier (verifier.cpp) ---------------------

  // True when the graph is ready for `operation`; otherwise reports why and returns false.
  bool beginStep(ssaopt::GraphOperation operation);
  // The facts that `operation` sets and clears.
  void endStep(ssaopt::GraphOperation operation) { m_State = ssaopt::stateAfter(operation, m_State); }
  class Verifier;

  // ---- Mechanism that several steps share (graph.cpp) -------------------------------------------

  // Deletes a statement of `block` and remembers it, so that forgetDeletedStatements can take it
  // out of the procedure records, which list calls, parameter and value-return statements.
  void deleteStatement(KvCBasicBlock& block, KvCCfgStatement* pStatement);
  // Takes every statement deleted since the last call out of every procedure record, so that no
  // record points to freed memory.
  void forgetDeletedStatements();

  // ---- Visited marks: set by constant propagation, read by dead-code elimination ---------------

  void setVisited(ssaopt::node v) { m_Visited[v] = true; }
  bool isVisited(ssaopt::node v) const { return m_Visited[v]; }
  void clearAllVisited() { m_Visited.fill(false); }

  // ---- Procedures and calls (procedures.cpp) ---------------------------------------------------

  // Fills `fcg` with one node per procedure and one edge per call of another procedure, and
  // refreshes every node's procedure from reachability.
  void buildFunctionCallGraph(ssaopt::graph& fcg, ssaopt::map<ssaopt::node, KvCCfgProcedure*>& procedureOf);
  // What makeProcedureAndCall does to a region, and the procedure table's new entries.
  class RegionSplitter;

  // ---- SSA construction: def/use summaries and interface statements (summaries.cpp) ------------

  // What every procedure, with all that it calls, defines and uses.
  void collectVarDefsAndUses();
  void addVarDefsAndUsesOfCalledProcs();
  void deleteVarDefsAndUsesStoredAtProcedures();
  // A block after every entry node: initial values in the start procedure, parameters elsewhere.
  void initVariablesAfterEntryNodes();
  void addVarInits(ssaopt::node v, ssaopt::set<KvCCfgVariable*> variables);
  void addParamStatements(ssaopt::node v, ssaopt::set<KvCCfgVariable*> variables,
                          KvCCfgProcedure* pProcedure);
  // After every call, what the callee defines comes back.
  void placeValueReturnStatements();
  void addValueReturnStatements(KvCBasicBlock* pBlock, ssaopt::set<KvCCfgVariable*> variables,
                                KvCCfgProcedure* pProcedure);
  // Before the exit of "#main", every output variable is read.
  void placeOutputStatements();

  // ---- SSA construction: dominators (dominators.cpp) -------------------------------------------

  class LengauerTarjan;

  // Immediate dominators of the component whose root (its last node without in-edges) has the
  // creation number `root`; a component without one is reported.
  void computeIdomsFast(std::uint32_t root, LengauerTarjan& dominators) const;
  // The immediate dominator of every node over control-flow edges, as computeAllIdoms finds it,
  // without giving it to the payloads.
  void computeControlFlowIdoms(ssaopt::node_array<ssaopt::node>& idom) const;
  // One tree per component, in component numbering, rooted at the component's entry node; returns
  // the number of trees. freeDominatorTrees deletes them again.
  int buildDominatorTrees(ssaopt::array<KvCDominatorTree*>& trees);
  void freeDominatorTrees(ssaopt::array<KvCDominatorTree*>& trees, int count);

  // ---- SSA construction: phi placement and renaming (ssa.cpp) ----------------------------------

  // Variable -> the nodes that define it, in node order, a node once per definition.
  using DefinitionSites = ssaopt::map<KvCCfgVariable*, ssaopt::array<ssaopt::node>>;
  class SSARenamer;

  // Fills `sites` and returns the assigned variables in order of first definition.
  ssaopt::list<KvCCfgVariable*> getDefinedVariables(DefinitionSites& sites);
  void renameVariables(ssaopt::array<KvCDominatorTree*>& trees);

  // ---- Sparse conditional constant propagation (constant_propagation.cpp) ----------------------

  // The work lists of a propagation: first in, first out.
  using EdgeWorkList = ssaopt::queue<ssaopt::edge>;

  // What one call of sparseConditionalConstant keeps while it runs: which procedures need another
  // visit, which edges carry the executable flag, and the merges of the phi functions.
  class PropagationRun;

  void buildVarUses();
  void initSparseConditionalConstant(ssaopt::node entry, EdgeWorkList& cfgWorkList,
                                     EdgeWorkList& ssaWorkList);
  void visitInstruction(KvCBasicBlock* pBasicBlock, ssaopt::node v, EdgeWorkList& cfgWorkList,
                        EdgeWorkList& ssaWorkList, bool& changed);
  void visitAssignment(KvCCfgAssignment* pAssignment, ssaopt::node v, EdgeWorkList& cfgWorkList,
                       EdgeWorkList& ssaWorkList, bool& changed);
  void visitBranchCondition(KvCCfgExpression* pCond, ssaopt::node v, EdgeWorkList& cfgWorkList);
  void visitParamStatement(KvCCfgParamStatement* pStatement, ssaopt::node v, EdgeWorkList& cfgWorkList,
                           EdgeWorkList& ssaWorkList, bool& changed);
  void visitValueReturnStatement(KvCCfgValueReturnStatement* pStatement, ssaopt::node v,
                                 EdgeWorkList& cfgWorkList, EdgeWorkList& ssaWorkList, bool& changed);
  void visitPhiFunction(KvCPhiFunction* pPhi, ssaopt::node v, bool& changed);
  int countExecutableInEdges(ssaopt::node v) const;
  int countCfgOutEdges(ssaopt::node v) const;

  // ---- Dead-code elimination (dead_code.cpp) ---------------------------------------------------

  // Deletes the blocks that the last pass did not reach with their phi operands elsewhere; true when
  // a phi operand was removed.
  bool eliminateDeadCode();
  // The deletion of one dead block and of the phi operands of its edges.
  class DeadCodeSweep;
  // A link of a chain of phi functions: a divided-block link between blocks holding one phi function
  // or, once removeUnusedVarDefs has taken it away, nothing (reading.cpp).
  bool isPhiChainLink(ssaopt::edge e) const;
  bool holdsPhiFunctionOrNothing(ssaopt::node v) const;

  // ---- Constant substitution, folding and unused definitions (substitution.cpp) ---------------

  class UnusedDefinitionRemoval;

  // ---- Valid-condition assignments (valid_conditions.cpp) --------------------------------------

  // Makes the assignments that the condition implies on its true and on its false branch (each
  // null when there is none; the caller owns them), or lets the condition become constant.
  void createValidConditionAssignments(KvCCfgExpression*& pCond, KvCCfgAssignment*& trueAssign,
                                       KvCCfgAssignment*& falseAssign);

  // ---- Procedure inlining (inlining.cpp) -------------------------------------------------------

  // What one run of inlineProcedures knows and does besides the inlining of one call.
  class InliningRun;
  // Inlines the call that the block of `v` holds when its procedure is called once; true when it
  // did, and `v` is gone then.
  bool inlineProcedureCalls(ssaopt::node v, KvCBasicBlock* pBasicBlock, InliningRun& run);

  // ---- Code hoisting (hoisting.cpp) ------------------------------------------------------------

  void performCodeHoisting(ssaopt::node v);
  // Whether `s` may move before a branch on `cond`: it must not define what the condition reads.
  bool checkForHoisting(KvCCfgStatement* s, KvCCfgExpression* cond) const;
  void deleteSSAEdges();

  // ---- The graph's state -------------------------------------------------------------------------

  ssaopt::node m_StartNode;
  ProcedureTable m_Procedures;
  ssaopt::GraphState m_State;
  // Absent entries read as false.
  ssaopt::node_array<bool> m_Visited;
  // Reached-marks for the walks of RegionSplitter: all false between walks, so that a walk costs the
  // size of what it reaches, not of the whole graph.
  ssaopt::node_array<bool> m_Reached;
  // Statements deleted since the procedure records last forgot them (compared, never read).
  ssaopt::set<const KvCCfgStatement*> m_DeletedStatements;
  // The edges that divideBasicBlock made between the pieces of one block. The operand removal walks
  // a chain of phi nodes along these only, never on into the next block.
  ssaopt::edge_array<bool> m_DividedBlockLinks;
  // The propagation in progress, on the stack of sparseConditionalConstant; null outside it.
  PropagationRun* m_pPropagation = nullptr;
};

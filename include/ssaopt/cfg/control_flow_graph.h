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
  friend class KvCControlFlowGraphTestAccess;

  // Class name and file of the internal error and consistency reports.
  static constexpr const char* kClassName = "KvCControlFlowGraph";

  // ---- The graph's state (step_checks.cpp) and its verifier (verifier.cpp) ---------------------

  // True when the graph is ready for `operation`; otherwise reports why and returns false.
  bool beginStep(ssaopt::GraphOperation operation);
  // The facts that `operation` sets and clears.
  void endStep(ssaopt::GraphOperation operation) { m_State = ssaopt::stateAfter(operation, m_State); }
  class Verifier;

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
  // Deletes a statement of `block` and remembers it, so that forgetDeletedStatements can take it
  // out of the procedure records, which list calls, parameter and value-return statements.
  void deleteStatement(KvCBasicBlock& block, KvCCfgStatement* pStatement);
  // Takes every statement deleted since the last call out of every procedure record, so that no
  // record points to freed memory.
  void forgetDeletedStatements();

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

  // ---- SSA construction: dominators (dominators.cpp) -------------------------------------------

  friend class KvCControlFlowGraphSSATestAccess;
  class LengauerTarjan;

  // Immediate dominators of one component, given as its nodes in node order.
  void computeIdomsFast(const ssaopt::array<ssaopt::node>& nodes, LengauerTarjan& dominators,
                        ssaopt::node_array<ssaopt::node>& idom) const;
  // The immediate dominator of every node over control-flow edges, as computeAllIdoms finds it,
  // without giving it to the payloads.
  void computeControlFlowIdoms(ssaopt::node_array<ssaopt::node>& idom) const;
  // One tree per component, in component numbering, rooted at the component's entry node; returns
  // the number of trees. freeDominatorTrees deletes them again.
  int buildDominatorTrees(ssaopt::array<KvCDominatorTree*>& trees);
  void freeDominatorTrees(ssaopt::array<KvCDominatorTree*>& trees, int count);
  void fillFrontier(const KvCDominatorTree& tree, ssaopt::node t);
  ssaopt::node idomOf(ssaopt::node v) const;

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

  void addDefsAndUsesOfBlock(const KvCBasicBlock& block, KvCCfgProcedure& procedure) const;
  void addArgumentUses(KvCCfgProcedure& caller, KvCCfgProcedureCall* pCall) const;
  static void addUses(KvCCfgProcedure& procedure, const ssaopt::set<KvCCfgVariable*>& variables);
  void addFormalsToDefinedVariables();
  static void passFormalWhereArgumentMissing(KvCCfgParamStatement& param,
                                             const ssaopt::list<KvCCfgProcedureCall*>& calls);
  ssaopt::node placeValueReturnStatementsAfterCalls(ssaopt::node v);

  // ---- SSA construction: phi placement and renaming (ssa.cpp) ----------------------------------

  // Variable -> the nodes that define it, in node order, a node once per definition.
  using DefinitionSites = ssaopt::map<KvCCfgVariable*, ssaopt::array<ssaopt::node>>;
  class SSARenamer;

  // Fills `sites` and returns the assigned variables in order of first definition.
  ssaopt::list<KvCCfgVariable*> getDefinedVariables(DefinitionSites& sites);
  KvCBasicBlock* blockForPhiFunctions(ssaopt::node y);
  KvCBasicBlock* turnExitIntoBlock(ssaopt::node y);
  void renameVariables(ssaopt::array<KvCDominatorTree*>& trees);

  // ---- Procedure inlining (inlining.cpp) -------------------------------------------------------

  using ProcedureSet = ssaopt::set<const KvCCfgProcedure*>;

  // What one run of inlineProcedures knows: the procedures called from one place, and which
  // procedure each inlined one went into.
  struct InliningRun {
    ProcedureSet calledOnce;
    ssaopt::map<const KvCCfgProcedure*, KvCCfgProcedure*> inlinedInto;

    KvCCfgProcedure* procedureNow(KvCCfgProcedure* pProcedure);
  };

  // Appends every call in the blocks of `nodes` to its procedure's call list; returns the nodes
  // whose blocks hold a call, in the order of `nodes`.
  ssaopt::list<ssaopt::node> registerCalls(const ssaopt::list<ssaopt::node>& nodes);
  ProcedureSet proceduresCalledOnce() const;
  // Inlines the call that the block of `v` holds when its procedure is called once; true when it
  // did, and `v` is gone then.
  bool inlineProcedureCalls(ssaopt::node v, KvCBasicBlock* pBasicBlock, InliningRun& run);
  bool canTakeBodyOf(ssaopt::node v, const KvCCfgProcedure& callee) const;
  void settleProcedures(InliningRun& run);
  ssaopt::node newParameterBlock(KvCCfgProcedure* pCaller, const KvCCfgProcedure& callee,
                                 KvCCfgProcedureCall* pCall);
  void spliceBody(ssaopt::node v, ssaopt::node parameters, KvCCfgProcedure* pCallee);

  // ---- Valid-condition assignments (valid_conditions.cpp) --------------------------------------

  // Makes the assignments that the condition implies on its true and on its false branch (each
  // null when there is none; the caller owns them), or lets the condition become constant.
  void createValidConditionAssignments(KvCCfgExpression*& pCond, KvCCfgAssignment*& trueAssign,
                                       KvCCfgAssignment*& falseAssign);
  void placeOnBranch(ssaopt::edge e, KvCCfgAssignment* pAssign);

  // ---- Code hoisting (hoisting.cpp) ------------------------------------------------------------

  void performCodeHoisting(ssaopt::node v);
  // The next statement that the walk down a branch from `e` offers for hoisting, with `e` moved on
  // past its block; null where the walk has to stop.
  KvCCfgStatement* nextHoistingCandidate(ssaopt::edge& e, bool skipNext) const;
  // Whether `s` may move before a branch on `cond`: it must not define what the condition reads.
  bool checkForHoisting(KvCCfgStatement* s, KvCCfgExpression* cond) const;
  ssaopt::set<KvCCfgVariable*> variablesDefinedBy(KvCCfgStatement* s) const;
  void deleteSSAEdges();

  ssaopt::node m_StartNode;
  ProcedureTable m_Procedures;
  ssaopt::GraphState m_State;
  // Absent entries read as false.
  ssaopt::node_array<bool> m_Visited;
  // Reached-marks for the walks of makeProcedureAndCall: all false between walks, so that a walk
  // costs the size of what it reaches, not of the whole graph.
  ssaopt::node_array<bool> m_Reached;
  // Statements deleted since the procedure records last forgot them (compared, never read).
  ssaopt::set<const KvCCfgStatement*> m_DeletedStatements;

  // ---- Sparse conditional constant propagation (constant_propagation.cpp) ----------------------

  void buildVarUses();
  void startPropagationRecord();
  void visitProcedure(int procedure, ssaopt::list<ssaopt::edge>& cfgWorkList,
                      ssaopt::list<ssaopt::edge>& ssaWorkList, bool& changed);
  void propagateFrom(ssaopt::node entry, ssaopt::list<ssaopt::edge>& cfgWorkList,
                     ssaopt::list<ssaopt::edge>& ssaWorkList, bool& changed);
  // A definition at `v` now holds another value or range: its procedure and the procedures of its
  // uses are visited again in the next pass.
  void unsettleDefinitionAt(ssaopt::node v);
  void unsettleProcedureOf(ssaopt::node v);
  // Dead-code elimination is about to delete `n`: its procedure changes, and so does every procedure
  // that a call in it passes arguments to.
  void unsettleProceduresOfDeadBlock(ssaopt::node n);
  void initSparseConditionalConstant(ssaopt::node entry, ssaopt::list<ssaopt::edge>& cfgWorkList,
                                     ssaopt::list<ssaopt::edge>& ssaWorkList);
  void flowStep(ssaopt::list<ssaopt::edge>& cfgWorkList, ssaopt::list<ssaopt::edge>& ssaWorkList,
                bool& changed);
  void ssaStep(ssaopt::list<ssaopt::edge>& cfgWorkList, ssaopt::list<ssaopt::edge>& ssaWorkList,
               bool& changed);
  void visitInstruction(KvCBasicBlock* pBasicBlock, ssaopt::node v, ssaopt::list<ssaopt::edge>& cfgWorkList,
                        ssaopt::list<ssaopt::edge>& ssaWorkList, bool& changed);
  void visitAssignment(KvCCfgAssignment* pAssignment, ssaopt::node v, ssaopt::list<ssaopt::edge>& cfgWorkList,
                       ssaopt::list<ssaopt::edge>& ssaWorkList, bool& changed);
  void visitBranchCondition(KvCCfgExpression* pCond, ssaopt::node v, ssaopt::list<ssaopt::edge>& cfgWorkList);
  void visitParamStatement(KvCCfgParamStatement* pStatement, ssaopt::node v,
                           ssaopt::list<ssaopt::edge>& cfgWorkList, ssaopt::list<ssaopt::edge>& ssaWorkList,
                           bool& changed);
  void visitValueReturnStatement(KvCCfgValueReturnStatement* pStatement, ssaopt::node v,
                                 ssaopt::list<ssaopt::edge>& cfgWorkList,
                                 ssaopt::list<ssaopt::edge>& ssaWorkList, bool& changed);
  // The visit shared by assignments, parameter and value-return statements: `definition` gives the
  // new value, minimum and maximum of `pVariable`. `stores` is false where no store happens (a
  // value-return statement takes back a value the variable already holds), so the value is not
  // adjusted to the variable a second time.
  template <class Definition>
  void visitDefinition(KvCCfgVariable* pVariable, const Definition& definition, ssaopt::node v,
                       ssaopt::list<ssaopt::edge>& cfgWorkList, ssaopt::list<ssaopt::edge>& ssaWorkList,
                       bool& changed, bool stores);
  template <class Definition>
  void recordRange(KvCCfgVariable* pVariable, const Definition& definition, bool stores);
  void visitPhiFunction(KvCPhiFunction* pPhi, ssaopt::node v, bool& changed);

  int countExecutableInEdges(ssaopt::node v) const;
  int countCfgOutEdges(ssaopt::node v) const;
  void appendCfgOutEdges(ssaopt::node v, ssaopt::list<ssaopt::edge>& workList) const;
  void appendSSAOutEdges(ssaopt::node v, ssaopt::list<ssaopt::edge>& workList) const;
  // The control-flow out-edges of `v`, in adjacency order; nil after the last.
  ssaopt::edge firstCfgOutEdge(ssaopt::node v) const;
  ssaopt::edge nextCfgOutEdge(ssaopt::edge e) const;
  ssaopt::edge controlFlowOrNil(ssaopt::edge e) const;

  void activateEdge(ssaopt::edge e);
  void deactivateExecutableEdges();
  void deactivateAllEdges();

  // The edges whose executable flag the current pass set since the last clearing, so that the next
  // procedure clears only those instead of every edge of the graph. Empty outside propagation.
  ssaopt::list<ssaopt::edge> m_ExecutableEdges;
  // Per node, how many in-edges carry the executable flag. The flow step asks at every edge that
  // becomes executable; counting at a join with many in-edges each time would be quadratic.
  ssaopt::node_array<int> m_ExecutableInEdges;

  // What propagation keeps between its passes so that a pass visits again only the procedures whose
  // visit could come out differently: a visit is a function of the procedure's own values, ranges and
  // blocks and of the values and ranges it reads through SSA edges from other procedures, so a
  // procedure whose last visit changed none of its definitions, and none of whose inputs changed
  // since, would repeat that visit exactly. Procedures are numbered by their position in the table.
  struct PropagationRecord {
    ssaopt::node_array<int> procedureOf;  // -1 for a node that no entry reaches
    ssaopt::array<bool> unsettled;        // per procedure: to be visited in the next pass
    // Per procedure, the nodes its last visit marked visited: a visit clears its own marks only, so
    // that the marks of the procedures a pass passes over stay for dead-code elimination.
    ssaopt::array<ssaopt::array<ssaopt::node>> visitedBy;
    ssaopt::array<ssaopt::node> entries;  // per procedure
    int current = -1;                     // the procedure being visited
  };
  PropagationRecord m_Propagation;

  // ---- Dead-code elimination (dead_code.cpp) ---------------------------------------------------

  // Deletes the blocks that the last pass did not reach with their phi operands elsewhere; true when
  // a phi operand was removed.
  bool eliminateDeadCode();
  bool isDeadBlock(ssaopt::node v) const;
  void keepExitsAttached();
  bool losesEveryInEdge(ssaopt::node v) const;
  ssaopt::map<KvCCfgProcedure*, ssaopt::edge> firstEdgesIntoDeadCode() const;
  // A reached phi node that a control-flow edge of `v` leads to, or nil.
  ssaopt::node reachedPhiSuccessor(ssaopt::node v) const;
  KvCPhiFunction* phiFunctionAt(ssaopt::node v) const;
  void removeDeadOperands(ssaopt::node t);
  ssaopt::array<int> removeDeadInEdges(ssaopt::node t);
  ssaopt::node nextPhiChainLink(ssaopt::node link) const;
  void removeOperands(ssaopt::node link, KvCPhiFunction& phi, const ssaopt::array<int>& positions);
  void destroyDeadBlock(ssaopt::node n);
  bool isDividedBlockLink(ssaopt::edge e) const;
  // A link of a chain of phi functions: a divided-block link between blocks holding one phi function
  // or, once removeUnusedVarDefs has taken it away, nothing (reading.cpp).
  bool isPhiChainLink(ssaopt::edge e) const;
  bool holdsPhiFunctionOrNothing(ssaopt::node v) const;

  // The edges that divideBasicBlock made between the pieces of one block. The operand removal walks
  // a chain of phi nodes along these only, never on into the next block.
  ssaopt::edge_array<bool> m_DividedBlockLinks;

  // ---- Constant substitution, folding and unused definitions (substitution.cpp) ---------------

  void removeDefinitionIfUnused(ssaopt::node v, bool& again);
};

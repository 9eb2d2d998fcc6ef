// Forward declarations of the program representation, so that headers can name each other's classes
// without including them. The four classes with the SF infix belong to the chart front end, a client
// of the library: the library only names them in its type queries and never defines them.
#pragma once

class KvCCfgVariable;
class KvCSSAVariable;

class KvCCfgExpression;
class KvCCfgValueExpression;
class KvCCfgVariableExpression;

class KvCCfgStatement;
class KvCCfgAssignment;
class KvCCfgInitAssignment;
class KvCCfgProcedureCall;
class KvCCfgExternCall;
class KvCPhiFunction;
class KvCCfgParamStatement;
class KvCCfgValueReturnStatement;
class KvCCfgOutputStatement;

class KvCCfgNodeInfo;
class KvCBasicBlock;
class KvCCfgEntry;
class KvCCfgExit;

class KvCCfgEdgeInfo;
class KvCCfgTrueBranch;
class KvCCfgFalseBranch;
class KvCSSAEdge;

class KvCCfgProcedure;
class KvCDominatorTree;

class KvCCfgSFVariable;
class KvCCfgSFExpression;
class KvCCfgSFAssignment;
class KvCCfgSFProcedureCall;

namespace ssaopt {

template <class T>
struct set_order;

// Sets of variables iterate in creation order (by object index), not by address: the library adds
// statements once per variable of a set (initialisations, value returns, output statements, phi
// functions), and their order must not depend on where the allocator put the variables, which
// differs between runs and after memory is reused.
template <>
struct set_order<KvCCfgVariable*> {
  bool operator()(const KvCCfgVariable* a, const KvCCfgVariable* b) const;
};

}  // namespace ssaopt

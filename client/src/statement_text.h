// The text of expressions, statements and lattice values, shared by the printer and the Graphviz
// writer. Before the SSA transformation it is the textual format itself; afterwards it also shows
// what the library added:
//
//   x.2 = phi(x.1 from bb3, x.4 from loop)     operands in the order of the block's in-edges
//   p.1 = param(x.2 + 1 from #main:bb5)        per call, the argument it passes
//   x.5 = return(x.9)                          after a call: the value coming back
//   output y.3                                 keeps an output variable alive to the end
//   init x.1 = 0                               initial value, or argument of an inlined call
//   virtual b.2 = 1                            what a branch condition implies
//   a.3 = a.2 with [i.1] = 5                   an element write, once the versions of a differ
#pragma once

#include <string>

#include "program_view.h"

namespace ssaopt::client::detail {

// "4", or "?" while undetermined, "*" when not constant (for a bound: when no bound is known).
std::string valueText(const KvCCfgValue& value);

std::string expressionText(const ProgramView& view, KvCCfgExpression* pExpression);

// Without the closing ';'.
std::string statementText(const ProgramView& view, KvCCfgStatement& statement);
std::string phiText(const ProgramView& view, KvCPhiFunction& phi, ssaopt::node block);

// The variable's current value and range: "4 in [4, 4]".
std::string propagatedText(KvCCfgVariable& variable);

// The variable a statement defines, or null; no kind of statement defines more than one.
KvCCfgVariable* definedVariable(KvCCfgStatement& statement);

}  // namespace ssaopt::client::detail

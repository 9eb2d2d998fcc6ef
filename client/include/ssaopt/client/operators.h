// The terms of the expression language: literals, variables, array elements and the operators of the
// value arithmetic. Parser, printer and expressions share this one table of spellings, arities and
// precedences, and compute every operator with the library's value arithmetic, so that an expression
// means in the client exactly what constant propagation assumes it means.
#pragma once

#include <cstdint>

#include "ssaopt/values/value.h"

namespace ssaopt::client {

enum class TermOp : std::uint8_t {
  // Operands.
  Literal,
  Variable,
  ElementRead,   // a[i]: the array in the term, the index its operand
  ElementWrite,  // the right-hand side of a[i] = e: the array in the term, operands i and e
  // Unary operators.
  Negate,
  Not,
  Complement,
  Abs,
  Sgn,
  // Binary operators.
  Multiply,
  Divide,
  Remainder,
  Add,
  Subtract,
  ShiftLeft,
  ShiftRight,
  Less,
  LessEqual,
  Greater,
  GreaterEqual,
  Equal,
  NotEqual,
  BitAnd,
  BitXor,
  BitOr,
  LogicalAnd,
  LogicalOr,
};

// How many operands a term takes from the terms before it (postfix order).
int arityOf(TermOp op);

// Binding strength for printing and parsing, as in C: a larger number binds tighter. Operands bind
// tightest of all (kAtomPrecedence), unary operators next (kUnaryPrecedence).
int precedenceOf(TermOp op);
inline constexpr int kAtomPrecedence = 100;
inline constexpr int kUnaryPrecedence = 90;

// The operator's text: "+", "<=", "abs", ...; operands have none.
const char* spellingOf(TermOp op);

// Whether a term reads, writes or indexes a variable.
bool namesVariable(TermOp op);

// Comparisons and the logical operators give 0 or 1 whatever their operands.
bool givesTruthValue(TermOp op);

// The operators that work on the 32-bit integer view of their operands.
bool isIntegerOperator(TermOp op);

// The value of an operator on lattice values. `op` must be a unary (binary) operator.
KvCCfgValue applyUnary(TermOp op, const KvCCfgValue& a);
KvCCfgValue applyBinary(TermOp op, const KvCCfgValue& a, const KvCCfgValue& b);

}  // namespace ssaopt::client

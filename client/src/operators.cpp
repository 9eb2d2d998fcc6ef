#include "ssaopt/client/operators.h"

#include <cstddef>

#include "ssaopt/values/arithmetic.h"

namespace ssaopt::client {

namespace {

struct OperatorInfo {
  const char* spelling;
  int arity;
  int precedence;
};

// Indexed by TermOp; C's precedence levels.
constexpr OperatorInfo kOperators[] = {
    {"", 0, kAtomPrecedence},    // Literal
    {"", 0, kAtomPrecedence},    // Variable
    {"", 1, kAtomPrecedence},    // ElementRead
    {"", 2, kAtomPrecedence},    // ElementWrite
    {"-", 1, kUnaryPrecedence},  // Negate
    {"!", 1, kUnaryPrecedence},  // Not
    {"~", 1, kUnaryPrecedence},  // Complement
    {"abs", 1, kAtomPrecedence},
    {"sgn", 1, kAtomPrecedence},
    {"*", 2, 80},
    {"/", 2, 80},
    {"%", 2, 80},
    {"+", 2, 70},
    {"-", 2, 70},
    {"<<", 2, 60},
    {">>", 2, 60},
    {"<", 2, 50},
    {"<=", 2, 50},
    {">", 2, 50},
    {">=", 2, 50},
    {"==", 2, 40},
    {"!=", 2, 40},
    {"&", 2, 33},
    {"^", 2, 32},
    {"|", 2, 31},
    {"&&", 2, 20},
    {"||", 2, 10},
};

static_assert(sizeof(kOperators) / sizeof(kOperators[0]) == static_cast<std::size_t>(TermOp::LogicalOr) + 1,
              "one table entry per term");

const OperatorInfo& infoOf(TermOp op) { return kOperators[static_cast<std::size_t>(op)]; }

}  // namespace

int arityOf(TermOp op) { return infoOf(op).arity; }

int precedenceOf(TermOp op) { return infoOf(op).precedence; }

const char* spellingOf(TermOp op) { return infoOf(op).spelling; }

bool namesVariable(TermOp op) {
  return op == TermOp::Variable || op == TermOp::ElementRead || op == TermOp::ElementWrite;
}

bool givesTruthValue(TermOp op) {
  switch (op) {
    case TermOp::Not:
    case TermOp::Less:
    case TermOp::LessEqual:
    case TermOp::Greater:
    case TermOp::GreaterEqual:
    case TermOp::Equal:
    case TermOp::NotEqual:
    case TermOp::LogicalAnd:
    case TermOp::LogicalOr:
      return true;
    default:
      return false;
  }
}

bool isIntegerOperator(TermOp op) {
  switch (op) {
    case TermOp::Complement:
    case TermOp::Remainder:
    case TermOp::ShiftLeft:
    case TermOp::ShiftRight:
    case TermOp::BitAnd:
    case TermOp::BitXor:
    case TermOp::BitOr:
      return true;
    default:
      return false;
  }
}

KvCCfgValue applyUnary(TermOp op, const KvCCfgValue& a) {
  switch (op) {
    case TermOp::Negate:
      return -a;
    case TermOp::Not:
      return !a;
    case TermOp::Complement:
      return ~a;
    case TermOp::Abs:
      return absoluteValue(a);
    case TermOp::Sgn:
      return sgn(a);
    default:
      return KvCCfgValue(eCfgNonConstant);
  }
}

KvCCfgValue applyBinary(TermOp op, const KvCCfgValue& a, const KvCCfgValue& b) {
  switch (op) {
    case TermOp::Multiply:
      return a * b;
    case TermOp::Divide:
      return a / b;
    case TermOp::Remainder:
      return a % b;
    case TermOp::Add:
      return a + b;
    case TermOp::Subtract:
      return a - b;
    case TermOp::ShiftLeft:
      return a << b;
    case TermOp::ShiftRight:
      return a >> b;
    case TermOp::Less:
      return a < b;
    case TermOp::LessEqual:
      return a <= b;
    case TermOp::Greater:
      return a > b;
    case TermOp::GreaterEqual:
      return a >= b;
    case TermOp::Equal:
      return a == b;
    case TermOp::NotEqual:
      return a != b;
    case TermOp::BitAnd:
      return a & b;
    case TermOp::BitXor:
      return a ^ b;
    case TermOp::BitOr:
      return a | b;
    case TermOp::LogicalAnd:
      return a && b;
    case TermOp::LogicalOr:
      return a || b;
    default:
      return KvCCfgValue(eCfgNonConstant);
  }
}

}  // namespace ssaopt::client

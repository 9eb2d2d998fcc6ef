// The syntax tree of a program text, as the parser reads it: names are not resolved yet and nothing is
// checked beyond the grammar. Names point into the program text, which the tree owns.
#pragma once

#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "ssaopt/client/diagnostics.h"
#include "ssaopt/client/operators.h"

namespace ssaopt::client {

struct SyntaxName {
  std::string_view text;
  SourcePos pos;
};

// One term of an expression in postfix order, as in KvCCfgSFExpression: a literal's number, or the
// name of a variable, read, written or indexed.
struct SyntaxTerm {
  TermOp op;
  SourcePos pos;
  double number = 0.0;
  std::string_view name;
};

struct SyntaxExpression {
  std::vector<SyntaxTerm> terms;
  SourcePos pos;
};

// A number written in a declaration, with where it stands.
struct SyntaxNumber {
  double value = 0.0;
  SourcePos pos;
};

struct SyntaxDeclaration {
  SyntaxName type;
  SyntaxName name;
  std::optional<SyntaxNumber> arrayLength;
  std::optional<SyntaxNumber> scaleLsb;
  std::optional<SyntaxNumber> scaleOffset;
  SourcePos saturatePos;  // of the word "saturate", when either limit is given
  std::optional<SyntaxNumber> lowerLimit;
  std::optional<SyntaxNumber> upperLimit;
  bool isOutput = false;
  bool isVolatile = false;
  std::optional<SourcePos> erasablePos;
  std::optional<SyntaxNumber> initValue;
};

struct SyntaxStatement {
  enum class Kind { Assignment, Call, ExternCall };
  Kind kind = Kind::Assignment;
  SourcePos pos;
  SyntaxName name;  // the variable assigned, the procedure called, the external function
  std::optional<SyntaxExpression> index;  // of an element write
  SyntaxExpression value;
  std::vector<SyntaxExpression> arguments;
  std::vector<SyntaxName> uses;
  std::vector<SyntaxName> modifies;
};

// Where a block goes: the block with that label, or the end of the procedure.
struct SyntaxTarget {
  SyntaxName label;
  bool isEnd = false;
};

// How a block ends: it falls through to the next block (or the procedure's end after the last block),
// jumps, or branches two ways.
struct SyntaxTerminator {
  enum class Kind { FallThrough, Goto, Branch };
  Kind kind = Kind::FallThrough;
  SourcePos pos;
  SyntaxExpression condition;
  SyntaxTarget onTrue;  // also the target of a goto
  SyntaxTarget onFalse;
};

struct SyntaxBlock {
  SyntaxName label;                     // empty text for the unlabelled first block
  std::optional<SourcePos> outlinePos;  // "outline L:" asks for makeProcedureAndCall on this block
  std::vector<SyntaxStatement> statements;
  SyntaxTerminator terminator;
};

struct SyntaxProcedure {
  SyntaxName name;
  std::vector<SyntaxName> formals;
  std::vector<SyntaxBlock> blocks;  // never empty
};

struct SyntaxProgram {
  std::unique_ptr<const std::string> text;  // on the heap, so that names stay valid when the tree moves
  std::vector<SyntaxDeclaration> declarations;
  std::vector<SyntaxProcedure> procedures;
  SourcePos endOfInput;
};

}  // namespace ssaopt::client

// Reads a program text into its syntax tree.
//
//   program     := { declaration | procedure }
//   declaration := "var" type name [ "[" length "]" ] { attribute } [ "=" number ] ";"
//   attribute   := "scale" "(" lsb [ "," offset ] ")" | "saturate" "(" [ lower ] ".." [ upper ] ")"
//                | "output" | "volatile" | "erasable"
//   procedure   := "proc" name [ "(" [ formal { "," formal } ] ")" ] "{" { item } "}"
//   item        := [ "outline" ] label ":" | statement
//   statement   := variable [ "[" expression "]" ] "=" expression ";"
//                | "call" name "(" [ expression { "," expression } ] ")" ";"
//                | "extern" name [ "uses" "(" names ")" ] [ "modifies" "(" names ")" ] ";"
//                | "goto" target ";" | "if" expression "goto" target "else" target ";"
//   target      := label | "end"
//
// Expressions are C's, with C's precedence, over numbers, true, false, inf, nan, variables, array
// elements a[i], abs(e) and sgn(e). Their nesting is bounded (kMaxExpressionNesting) so that reading
// one never exhausts the stack; everything else is read without recursion.
#pragma once

#include <string>

#include "ssaopt/client/syntax.h"

namespace ssaopt::client {

// Parentheses, unary operators, indexes and abs/sgn nested deeper than this are rejected: generated
// code never comes near it, and it keeps the reading recursion far from the stack's limit.
inline constexpr int kMaxExpressionNesting = 1000;

// Records every syntax error in `diagnostics`, going on after each at the next statement or
// declaration, and stops when the list has too many. The tree is complete when no error was recorded.
SyntaxProgram parseProgram(std::string text, DiagnosticList& diagnostics);

// Words that name no variable, label or procedure.
bool isReservedWord(std::string_view word);

}  // namespace ssaopt::client

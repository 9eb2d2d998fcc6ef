// Infix text of an expression whose terms come in postfix order, as the terms of an expression do,
// in time linear in the length of the text and without recursion. Building the text of each operand
// and then its parent's around it copies every operand once per enclosing term, which is quadratic in
// a long chain such as x + x + ... + x; here each term records only the text around its operands, and
// the whole text is written once, at the end.
#pragma once

#include <cstdint>
#include <string>
#include <vector>

namespace ssaopt::client::detail {

class InfixText {
public:
  // What decides whether an operand needs parentheses: the precedence of its outermost operator and
  // its first character.
  struct Operand {
    int precedence;
    char first;
  };

  // A term with up to two operands: before, operand 0, between, operand 1, after. A hidden operand
  // is left out of the text.
  struct Term {
    std::string before;
    std::string between;
    std::string after;
    int precedence;
    bool parenthesised[2] = {false, false};
    bool hidden[2] = {false, false};
  };

  // The last `arity` pieces, the operands of the next term (the first operand first).
  const Operand* operands(std::size_t arity) const { return m_Stack.data() + (m_Stack.size() - arity); }
  std::size_t pieces() const { return m_Stack.size(); }

  // Replaces the last `arity` pieces by the term around them.
  void push(std::size_t arity, const Term& term);

  // The text of a piece: 0 is the first piece on the stack.
  std::string text(std::size_t piece) const;

private:
  struct Node {
    std::uint32_t fragments;  // where its before, between and after start in m_Fragments
    std::uint32_t beforeLength;
    std::uint32_t betweenLength;
    std::uint32_t afterLength;
    std::uint32_t operands[2];
    std::uint8_t arity;
    bool parenthesised;  // by the term it is an operand of
    bool hidden;         // by the term it is an operand of
  };
  void write(std::uint32_t root, std::string& out) const;

  std::string m_Fragments;
  std::vector<Node> m_Nodes;
  std::vector<Operand> m_Stack;
  std::vector<std::uint32_t> m_StackNodes;  // the node of each piece on the stack
};

}  // namespace ssaopt::client::detail

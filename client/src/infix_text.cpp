#include "infix_text.h"

namespace ssaopt::client::detail {

void InfixText::push(std::size_t arity, const Term& term) {
  Node node{static_cast<std::uint32_t>(m_Fragments.size()),
            static_cast<std::uint32_t>(term.before.size()),
            static_cast<std::uint32_t>(term.between.size()),
            static_cast<std::uint32_t>(term.after.size()),
            {0, 0},
            static_cast<std::uint8_t>(arity),
            false,
            false};
  m_Fragments += term.before;
  m_Fragments += term.between;
  m_Fragments += term.after;
  std::size_t first = m_Stack.size() - arity;
  for (std::size_t i = 0; i < arity; ++i) {
    node.operands[i] = m_StackNodes[first + i];
    m_Nodes[node.operands[i]].parenthesised = term.parenthesised[i];
    m_Nodes[node.operands[i]].hidden = term.hidden[i];
  }
  char firstCharacter = 0;
  if (!term.before.empty())
    firstCharacter = term.before[0];
  else if (arity > 0 && !term.hidden[0])
    firstCharacter = term.parenthesised[0] ? '(' : m_Stack[first].first;
  m_Stack.resize(first);
  m_StackNodes.resize(first);
  m_Stack.push_back(Operand{term.precedence, firstCharacter});
  m_StackNodes.push_back(static_cast<std::uint32_t>(m_Nodes.size()));
  m_Nodes.push_back(node);
}

std::string InfixText::text(std::size_t piece) const {
  std::string out;
  write(m_StackNodes[piece], out);
  return out;
}

// Depth first with a stack of its own: a node is visited once before its first operand, once between
// its operands and once after its last.
void InfixText::write(std::uint32_t root, std::string& out) const {
  struct Visit {
    std::uint32_t node;
    std::uint8_t stage;
  };
  std::vector<Visit> visits{{root, 0}};
  while (!visits.empty()) {
    Visit visit = visits.back();
    visits.pop_back();
    const Node& node = m_Nodes[visit.node];
    const char* fragments = m_Fragments.data() + node.fragments;
    if (visit.stage == 0) {
      if (node.parenthesised) out += '(';
      out.append(fragments, node.beforeLength);
    } else if (visit.stage == 1) {
      out.append(fragments + node.beforeLength, node.betweenLength);
    } else {
      out.append(fragments + node.beforeLength + node.betweenLength, node.afterLength);
      if (node.parenthesised) out += ')';
      continue;
    }
    visits.push_back(Visit{visit.node, static_cast<std::uint8_t>(visit.stage + 1)});
    if (visit.stage < node.arity && !m_Nodes[node.operands[visit.stage]].hidden)
      visits.push_back(Visit{node.operands[visit.stage], 0});
  }
}

}  // namespace ssaopt::client::detail

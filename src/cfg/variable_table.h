// What a step notes per variable while it runs (the definition of each, the merges that read it),
// found by the variable's index: an array of chains instead of a hash map or a tree of pointers. A
// chain holds the entries of all variables with one index (indexes repeat only after their counter
// was restarted), each entry naming its variable; nothing iterates the table, so no order depends on
// addresses.
#pragma once

#include <cstddef>

#include "ssaopt/frame/containers.h"
#include "ssaopt/ir/variable.h"

namespace ssaopt::cfg {

template <class T>
class VariableTable {
public:
  void insert(const KvCCfgVariable& variable, const T& value) {
    std::size_t index = variable.getIndex();
    if (index >= m_First.size()) m_First.resize(index + 1, kNone);
    m_Entries.push_back({&variable, value, m_First[index]});
    m_First[index] = static_cast<int>(m_Entries.size() - 1);
  }

  // Calls `onValue` with every value inserted for `variable`, the latest first.
  template <class OnValue>
  void forEach(const KvCCfgVariable& variable, OnValue onValue) const {
    std::size_t index = variable.getIndex();
    if (index >= m_First.size()) return;
    for (int i = m_First[index]; i != kNone; i = m_Entries[static_cast<std::size_t>(i)].next) {
      const Entry& entry = m_Entries[static_cast<std::size_t>(i)];
      if (entry.pVariable == &variable) onValue(entry.value);
    }
  }

private:
  static constexpr int kNone = -1;

  struct Entry {
    const KvCCfgVariable* pVariable;
    T value;
    int next;
  };

  array<int> m_First;  // by variable index
  array<Entry> m_Entries;
};

}  // namespace ssaopt::cfg

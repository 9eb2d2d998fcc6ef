// Containers of the library. They follow the module allocation rule and iterate in fixed orders:
// lists in insertion order, sets in ascending element order (pointers by address, graph nodes by
// creation number), maps in insertion order, string maps in ascending key order. No iteration whose
// order can change a result goes over a hash container.
#pragma once

#include <cstddef>
#include <functional>
#include <list>
#include <map>
#include <set>
#include <unordered_map>
#include <utility>
#include <vector>

#include "ssaopt/frame/memory.h"
#include "ssaopt/frame/string.h"

namespace ssaopt {

// Doubly linked list, insertion order.
template <class T>
using list = std::list<T, ModuleAllocator<T>>;

// The order of a set where none is given. Classes whose sets must not iterate by address specialise
// it (before any set of theirs is used).
template <class T>
struct set_order : std::less<T> {};

// Balanced search tree, ascending order.
template <class T, class Less = set_order<T>>
using set = std::set<T, Less, ModuleAllocator<T>>;

// Indexed array.
template <class T>
using array = std::vector<T, ModuleAllocator<T>>;

// Ordered map keyed by host strings, ascending by string comparison.
template <class V>
using string_map =
    std::map<BxCXString, V, std::less<BxCXString>, ModuleAllocator<std::pair<const BxCXString, V>>>;

// Inserts every element of `from` into `into` (set union in place).
template <class Set>
void insertAll(Set& into, const Set& from) {
  into.insert(from.begin(), from.end());
}

// Keeps only the elements of `into` that are also in `other` (set intersection in place).
template <class Set>
void intersectWith(Set& into, const Set& other) {
  for (auto it = into.begin(); it != into.end();) it = other.count(*it) ? std::next(it) : into.erase(it);
}

// Stack on a growable array.
template <class T>
class stack {
public:
  void push(const T& x) { m_Items.push_back(x); }
  // Removes and returns the top element; the stack must not be empty.
  T pop() {
    T top = m_Items.back();
    m_Items.pop_back();
    return top;
  }
  const T& top() const { return m_Items.back(); }
  T& top() { return m_Items.back(); }
  bool empty() const { return m_Items.empty(); }
  std::size_t size() const { return m_Items.size(); }
  void clear() { m_Items.clear(); }

private:
  array<T> m_Items;
};

// An object that its owner makes on first use: until then it costs one pointer. Copies copy the
// object (or its absence); memory follows the module allocation rule.
template <class T>
class on_demand {
public:
  on_demand() = default;
  on_demand(const on_demand& other) : m_pObject(other.m_pObject ? make(*other.m_pObject) : nullptr) {}
  on_demand& operator=(const on_demand& other) {
    if (this != &other) {
      T* pCopy = other.m_pObject ? make(*other.m_pObject) : nullptr;
      reset();
      m_pObject = pCopy;
    }
    return *this;
  }
  ~on_demand() { reset(); }

  // The object, made now if it was not.
  T& get() {
    if (!m_pObject) m_pObject = make(T());
    return *m_pObject;
  }
  // The object, or null when it was never made.
  T* find() const { return m_pObject; }
  void reset() {
    if (!m_pObject) return;
    m_pObject->~T();
    ModuleAllocator<T>().deallocate(m_pObject, 1);
    m_pObject = nullptr;
  }

private:
  static T* make(const T& from) {
    T* pObject = ModuleAllocator<T>().allocate(1);
    try {
      return new (pObject) T(from);
    } catch (...) {
      ModuleAllocator<T>().deallocate(pObject, 1);
      throw;
    }
  }

  T* m_pObject = nullptr;
};

// First-in first-out queue on a growable array: no allocation per element, unlike a list. The slots
// before the front are given up once they are the larger part, so a queue that never empties keeps
// at most twice what it holds (and each element is moved at most once on average).
template <class T>
class queue {
public:
  void push_back(const T& x) { m_Items.push_back(x); }
  // The queue must not be empty.
  const T& front() const { return m_Items[m_Front]; }
  T pop_front() {
    T first = m_Items[m_Front++];
    if (m_Front == m_Items.size())
      clear();
    else if (m_Front >= kCompactAfter && 2 * m_Front >= m_Items.size())
      compact();
    return first;
  }
  bool empty() const { return m_Front == m_Items.size(); }
  std::size_t size() const { return m_Items.size() - m_Front; }
  void clear() {
    m_Items.clear();
    m_Front = 0;
  }

private:
  static constexpr std::size_t kCompactAfter = 1024;

  void compact() {
    m_Items.erase(m_Items.begin(), m_Items.begin() + static_cast<std::ptrdiff_t>(m_Front));
    m_Front = 0;
  }

  array<T> m_Items;
  std::size_t m_Front = 0;
};

// Hash map on a pointer or integer key that iterates in insertion order. Reading a key with
// operator[] creates the entry with a default value, as the library's algorithms expect.
template <class K, class V, class Hash = std::hash<K>>
class map {
  using Entry = std::pair<const K, V>;
  using Entries = list<Entry>;

public:
  using iterator = typename Entries::iterator;
  using const_iterator = typename Entries::const_iterator;

  map() = default;
  map(const map& other) { copyFrom(other); }
  map& operator=(const map& other) {
    if (this != &other) {
      clear();
      copyFrom(other);
    }
    return *this;
  }
  map(map&&) noexcept = default;
  map& operator=(map&&) noexcept = default;

  V& operator[](const K& key) {
    auto found = m_Index.find(key);
    if (found != m_Index.end()) return found->second->second;
    m_Entries.emplace_back(key, V());
    auto last = std::prev(m_Entries.end());
    m_Index.emplace(key, last);
    return last->second;
  }
  bool defined(const K& key) const { return m_Index.count(key) != 0; }
  // The value of `key`, or null when it has no entry; never creates one.
  V* lookup(const K& key) {
    auto found = m_Index.find(key);
    return found == m_Index.end() ? nullptr : &found->second->second;
  }
  const V* lookup(const K& key) const {
    auto found = m_Index.find(key);
    return found == m_Index.end() ? nullptr : &found->second->second;
  }
  // Removes the entry of `key`, if any.
  void undefine(const K& key) {
    auto found = m_Index.find(key);
    if (found == m_Index.end()) return;
    m_Entries.erase(found->second);
    m_Index.erase(found);
  }
  std::size_t size() const { return m_Entries.size(); }
  bool empty() const { return m_Entries.empty(); }
  void clear() {
    m_Index.clear();
    m_Entries.clear();
  }

  iterator begin() { return m_Entries.begin(); }
  iterator end() { return m_Entries.end(); }
  const_iterator begin() const { return m_Entries.begin(); }
  const_iterator end() const { return m_Entries.end(); }

private:
  void copyFrom(const map& other) {
    for (const Entry& entry : other.m_Entries) (*this)[entry.first] = entry.second;
  }

  Entries m_Entries;
  std::unordered_map<K, iterator, Hash, std::equal_to<K>, ModuleAllocator<std::pair<const K, iterator>>>
      m_Index;
};

}  // namespace ssaopt

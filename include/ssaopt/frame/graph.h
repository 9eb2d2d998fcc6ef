// Directed graphs with node and edge handles, per-node and per-edge arrays, and the payload-carrying
// graph that the control-flow graph and the dominator trees derive from.
//
// Guarantees the rest of the library builds on:
// - creating, deleting and moving nodes and edges is O(1) (intrusive lists);
// - nodes and edges iterate in creation order, also after deletions;
// - new_edge(v, w) appends the edge to v's out-edges and w's in-edges;
// - move_edge(e, v, w) unlinks an end that changes and appends it at the end of the new node's list,
//   while an end that stays keeps its position (so the in-edge order of a target, which orders its
//   phi operands, survives moving the edge to a new source);
// - a handle carries its node's creation number, so ordering, hashing and comparing handles never
//   read the node itself: sets of nodes may outlive the nodes they hold.
#pragma once

#include <cstdint>
#include <functional>
#include <iterator>
#include <type_traits>
#include <vector>

#include "ssaopt/frame/containers.h"
#include "ssaopt/frame/memory.h"

namespace ssaopt {

namespace detail {
struct NodeRep;
struct EdgeRep;
}  // namespace detail

// The null handle, comparable with and convertible to node and edge.
struct nil_t {
  explicit constexpr nil_t(int) {}
};
inline constexpr nil_t nil{0};

class graph;

// Handle of a node. Its index is the node's creation number in its graph, unique for the graph's
// lifetime (never reused), so sets of nodes iterate in creation order.
class node {
public:
  node() = default;
  node(nil_t) {}  // NOLINT: implicit, so that `v = nil` reads as in the algorithms

  std::uint32_t index() const { return m_Index; }
  bool isNil() const { return m_pRep == nullptr; }
  explicit operator bool() const { return m_pRep != nullptr; }

  friend bool operator==(node a, node b) { return a.m_pRep == b.m_pRep && a.m_Index == b.m_Index; }
  friend bool operator!=(node a, node b) { return !(a == b); }
  friend bool operator==(node a, nil_t) { return a.m_pRep == nullptr; }
  friend bool operator!=(node a, nil_t) { return a.m_pRep != nullptr; }
  friend bool operator<(node a, node b) {
    if (a.m_Index != b.m_Index) return a.m_Index < b.m_Index;
    return std::less<const detail::NodeRep*>()(a.m_pRep, b.m_pRep);
  }

  // The handle of a representation (nil for null); for the graph layer itself.
  static node fromRep(detail::NodeRep* rep);

private:
  friend class graph;
  node(detail::NodeRep* rep, std::uint32_t index) : m_pRep(rep), m_Index(index) {}

  detail::NodeRep* m_pRep = nullptr;
  std::uint32_t m_Index = 0;
};

// Handle of an edge; its index is the edge's creation number in its graph.
class edge {
public:
  edge() = default;
  edge(nil_t) {}  // NOLINT: implicit, as for node

  std::uint32_t index() const { return m_Index; }
  bool isNil() const { return m_pRep == nullptr; }
  explicit operator bool() const { return m_pRep != nullptr; }

  friend bool operator==(edge a, edge b) { return a.m_pRep == b.m_pRep && a.m_Index == b.m_Index; }
  friend bool operator!=(edge a, edge b) { return !(a == b); }
  friend bool operator==(edge a, nil_t) { return a.m_pRep == nullptr; }
  friend bool operator!=(edge a, nil_t) { return a.m_pRep != nullptr; }
  friend bool operator<(edge a, edge b) {
    if (a.m_Index != b.m_Index) return a.m_Index < b.m_Index;
    return std::less<const detail::EdgeRep*>()(a.m_pRep, b.m_pRep);
  }

  // The handle of a representation (nil for null); for the graph layer itself.
  static edge fromRep(detail::EdgeRep* rep);

private:
  friend class graph;
  edge(detail::EdgeRep* rep, std::uint32_t index) : m_pRep(rep), m_Index(index) {}

  detail::EdgeRep* m_pRep = nullptr;
  std::uint32_t m_Index = 0;
};

namespace detail {

struct NodeRep {
  SSAOPT_MODULE_ALLOCATED
  std::uint32_t index;
  NodeRep* prev = nullptr;  // in the graph's node list
  NodeRep* next = nullptr;
  EdgeRep* firstOut = nullptr;
  EdgeRep* lastOut = nullptr;
  EdgeRep* firstIn = nullptr;
  EdgeRep* lastIn = nullptr;
  int outdeg = 0;
  int indeg = 0;
};

struct EdgeRep {
  SSAOPT_MODULE_ALLOCATED
  std::uint32_t index;
  NodeRep* source = nullptr;
  NodeRep* target = nullptr;
  EdgeRep* prev = nullptr;  // in the graph's edge list
  EdgeRep* next = nullptr;
  EdgeRep* prevOut = nullptr;  // in the source's out-edge list
  EdgeRep* nextOut = nullptr;
  EdgeRep* prevIn = nullptr;  // in the target's in-edge list
  EdgeRep* nextIn = nullptr;
};

// Forward iteration over an intrusive list that fetches the successor before yielding an element, so
// the loop body may delete the element it is given (but no other element of the same list).
template <class Handle, class Rep, Rep* Rep::*Next>
class LinkRange {
public:
  class iterator {
  public:
    using iterator_category = std::forward_iterator_tag;
    using value_type = Handle;
    using difference_type = std::ptrdiff_t;
    using pointer = const Handle*;
    using reference = Handle;

    explicit iterator(Rep* rep) : m_pRep(rep), m_pNext(rep ? rep->*Next : nullptr) {}
    Handle operator*() const { return Handle::fromRep(m_pRep); }
    iterator& operator++() {
      m_pRep = m_pNext;
      m_pNext = m_pRep ? m_pRep->*Next : nullptr;
      return *this;
    }
    friend bool operator==(const iterator& a, const iterator& b) { return a.m_pRep == b.m_pRep; }
    friend bool operator!=(const iterator& a, const iterator& b) { return a.m_pRep != b.m_pRep; }

  private:
    Rep* m_pRep;
    Rep* m_pNext;
  };

  explicit LinkRange(Rep* first) : m_pFirst(first) {}
  iterator begin() const { return iterator(m_pFirst); }
  iterator end() const { return iterator(nullptr); }

private:
  Rep* m_pFirst;
};

}  // namespace detail

// A directed graph. Copying builds a graph of the same shape whose nodes and edges are new (numbered
// afresh in the source's order).
class graph {
public:
  SSAOPT_MODULE_ALLOCATED

  using NodeRange = detail::LinkRange<node, detail::NodeRep, &detail::NodeRep::next>;
  using EdgeRange = detail::LinkRange<edge, detail::EdgeRep, &detail::EdgeRep::next>;
  using OutEdgeRange = detail::LinkRange<edge, detail::EdgeRep, &detail::EdgeRep::nextOut>;
  using InEdgeRange = detail::LinkRange<edge, detail::EdgeRep, &detail::EdgeRep::nextIn>;

  graph() = default;
  graph(const graph& other);
  graph& operator=(const graph& other);
  virtual ~graph();

  node new_node();
  edge new_edge(node v, node w);
  // Deletes `v` together with its edges.
  void del_node(node v);
  void del_edge(edge e);
  // Gives `e` the source `v` and the target `w`; see the ordering guarantee at the top of this file.
  void move_edge(edge e, node v, node w);
  // Deletes every node and edge. Creation numbers are not reused afterwards.
  void clear();

  node source(edge e) const { return makeHandle(e.m_pRep->source); }
  node target(edge e) const { return makeHandle(e.m_pRep->target); }
  // The end of `e` that is not `v`.
  node opposite(node v, edge e) const { return source(e) == v ? target(e) : source(e); }
  int outdeg(node v) const { return v.m_pRep->outdeg; }
  int indeg(node v) const { return v.m_pRep->indeg; }
  int number_of_nodes() const { return m_NodeCount; }
  int number_of_edges() const { return m_EdgeCount; }
  bool empty() const { return m_NodeCount == 0; }

  // Creation numbers: index(v) < max_node_index() + 1 for every node ever created; node_array and
  // edge_array are indexed by them.
  std::uint32_t index(node v) const { return v.index(); }
  std::uint32_t index(edge e) const { return e.index(); }
  int max_node_index() const { return static_cast<int>(m_NextNodeIndex) - 1; }
  int max_edge_index() const { return static_cast<int>(m_NextEdgeIndex) - 1; }

  // Walks in creation order; each returns nil past the end.
  node first_node() const { return makeHandle(m_pFirstNode); }
  node last_node() const { return makeHandle(m_pLastNode); }
  node next_node(node v) const { return makeHandle(v.m_pRep->next); }
  node pred_node(node v) const { return makeHandle(v.m_pRep->prev); }
  edge first_edge() const { return makeHandle(m_pFirstEdge); }
  edge last_edge() const { return makeHandle(m_pLastEdge); }
  edge next_edge(edge e) const { return makeHandle(e.m_pRep->next); }

  // Walks in adjacency order.
  edge first_adj_edge(node v) const { return makeHandle(v.m_pRep->firstOut); }
  edge last_adj_edge(node v) const { return makeHandle(v.m_pRep->lastOut); }
  edge adj_succ(edge e) const { return makeHandle(e.m_pRep->nextOut); }
  edge adj_pred(edge e) const { return makeHandle(e.m_pRep->prevOut); }
  edge first_in_edge(node v) const { return makeHandle(v.m_pRep->firstIn); }
  edge last_in_edge(node v) const { return makeHandle(v.m_pRep->lastIn); }
  edge in_succ(edge e) const { return makeHandle(e.m_pRep->nextIn); }
  edge in_pred(edge e) const { return makeHandle(e.m_pRep->prevIn); }

  // Copies, for walks that change the graph.
  list<node> all_nodes() const;
  list<edge> all_edges() const;
  list<edge> out_edges(node v) const;
  list<edge> in_edges(node v) const;

  // Live views without copying. The loop body may delete the element it is given, nothing else.
  NodeRange nodes() const { return NodeRange(m_pFirstNode); }
  EdgeRange edges() const { return EdgeRange(m_pFirstEdge); }
  OutEdgeRange out(node v) const { return OutEdgeRange(v.m_pRep->firstOut); }
  InEdgeRange in(node v) const { return InEdgeRange(v.m_pRep->firstIn); }

  // Position of `e` among the in-edges of its target (0 for the first).
  int in_position(edge e) const;

  static node makeHandle(detail::NodeRep* rep) { return node::fromRep(rep); }
  static edge makeHandle(detail::EdgeRep* rep) { return edge::fromRep(rep); }

private:
  void copyShapeFrom(const graph& other);
  void linkOut(detail::EdgeRep* e, detail::NodeRep* v);
  void unlinkOut(detail::EdgeRep* e);
  void linkIn(detail::EdgeRep* e, detail::NodeRep* w);
  void unlinkIn(detail::EdgeRep* e);

  detail::NodeRep* m_pFirstNode = nullptr;
  detail::NodeRep* m_pLastNode = nullptr;
  detail::EdgeRep* m_pFirstEdge = nullptr;
  detail::EdgeRep* m_pLastEdge = nullptr;
  int m_NodeCount = 0;
  int m_EdgeCount = 0;
  std::uint32_t m_NextNodeIndex = 0;
  std::uint32_t m_NextEdgeIndex = 0;
  // Keeps the pools that served the nodes and edges from releasing their memory while the graph
  // lives; a copy holds what served its own nodes and edges.
  PoolHold m_PoolHold;
};

// A value for every node (or edge) of a graph, indexed by creation number. Entries for nodes created
// after the array are added on first write with the array's default value.
inline node node::fromRep(detail::NodeRep* rep) { return rep ? node(rep, rep->index) : node(); }
inline edge edge::fromRep(detail::EdgeRep* rep) { return rep ? edge(rep, rep->index) : edge(); }

template <class Handle, class T>
class handle_array {
public:
  handle_array() = default;
  explicit handle_array(const graph& G, const T& init = T()) { this->init(G, init); }
  handle_array(std::size_t size, const T& init) : m_Default(init), m_Slots(size, Slot{init}) {}

  void init(const graph& G, const T& init = T()) {
    m_Default = init;
    m_Slots.assign(slotsFor(G), Slot{init});
  }
  // Sets every entry back to the default value, keeping the size.
  void fill(const T& value) {
    m_Default = value;
    for (Slot& slot : m_Slots) slot.value = value;
  }

  T& operator[](Handle h) {
    if (h.index() >= m_Slots.size()) m_Slots.resize(h.index() + 1, Slot{m_Default});
    return m_Slots[h.index()].value;
  }
  const T& operator[](Handle h) const { return h.index() < m_Slots.size() ? m_Slots[h.index()].value : m_Default; }

private:
  // Boxed so that T = bool is an ordinary array of bools with real references.
  struct Slot {
    T value;
  };
  static std::size_t slotsFor(const graph& G);

  T m_Default{};
  std::vector<Slot, ModuleAllocator<Slot>> m_Slots;
};

template <class Handle, class T>
std::size_t handle_array<Handle, T>::slotsFor(const graph& G) {
  if constexpr (std::is_same_v<Handle, node>)
    return static_cast<std::size_t>(G.max_node_index() + 1);
  else
    return static_cast<std::size_t>(G.max_edge_index() + 1);
}

template <class T>
using node_array = handle_array<node, T>;
template <class T>
using edge_array = handle_array<edge, T>;

// Payload type of a graph whose nodes or edges carry nothing.
struct no_payload {};

// A graph whose nodes carry an N and whose edges carry an E. Payloads are plain values (pointers for
// the control-flow graph): deleting a node, an edge or the graph never deletes what a payload points
// to.
template <class N, class E>
class GRAPH : public graph {
public:
  GRAPH() = default;
  GRAPH(const GRAPH& other) : graph(other) { copyPayloadsFrom(other); }
  GRAPH& operator=(const GRAPH& other) {
    if (this != &other) {
      graph::operator=(other);
      m_NodeInf = node_array<N>();
      m_EdgeInf = edge_array<E>();
      copyPayloadsFrom(other);
    }
    return *this;
  }

  using graph::new_edge;
  using graph::new_node;
  node new_node(const N& x) {
    node v = graph::new_node();
    assign(v, x);
    return v;
  }
  edge new_edge(node v, node w, const E& x) {
    edge e = graph::new_edge(v, w);
    assign(e, x);
    return e;
  }

  const N& inf(node v) const { return m_NodeInf[v]; }
  const E& inf(edge e) const { return m_EdgeInf[e]; }
  N& operator[](node v) { return m_NodeInf[v]; }
  E& operator[](edge e) { return m_EdgeInf[e]; }
  void assign(node v, const N& x) { m_NodeInf[v] = x; }
  void assign(edge e, const E& x) { m_EdgeInf[e] = x; }

private:
  // The copy's nodes and edges were created in the source's order, so the k-th of each corresponds.
  void copyPayloadsFrom(const GRAPH& other) {
    node mine = first_node();
    for (node theirs : other.nodes()) {
      assign(mine, other.inf(theirs));
      mine = next_node(mine);
    }
    edge myEdge = first_edge();
    for (edge theirs : other.edges()) {
      assign(myEdge, other.inf(theirs));
      myEdge = next_edge(myEdge);
    }
  }

  node_array<N> m_NodeInf;
  edge_array<E> m_EdgeInf;
};

}  // namespace ssaopt

namespace std {
template <>
struct hash<ssaopt::node> {
  std::size_t operator()(ssaopt::node v) const noexcept { return v.index(); }
};
template <>
struct hash<ssaopt::edge> {
  std::size_t operator()(ssaopt::edge e) const noexcept { return e.index(); }
};
}  // namespace std

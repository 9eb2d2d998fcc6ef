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
// - a handle is its node's creation number and nothing else, so ordering, hashing and comparing
//   handles never read the node itself: sets of nodes may outlive the nodes they hold.
//
// Nodes and edges are records of 32-bit creation numbers in arrays of chunks that never move, indexed
// by creation number: a node costs 32 bytes and an edge 32, where records linked by pointers cost 64
// and 72, and a handle costs 4 bytes. A deleted node's or edge's record stays unused, since creation
// numbers are never given again (clear() gives back the records of all).
#pragma once

#include <cstdint>
#include <functional>
#include <iterator>
#include <type_traits>
#include <vector>

#include "ssaopt/frame/containers.h"
#include "ssaopt/frame/memory.h"

namespace ssaopt {

// The null handle, comparable with and convertible to node and edge.
struct nil_t {
  explicit constexpr nil_t(int) {}
};
inline constexpr nil_t nil{0};

class graph;

namespace detail {

// A handle: creation number + 1, so that 0 is nil. A nil handle's index() is 0, as before any node.
template <class Tag>
class Handle {
public:
  Handle() = default;
  Handle(nil_t) {}  // NOLINT: implicit, so that `v = nil` reads as in the algorithms

  std::uint32_t index() const { return m_Id == 0 ? 0 : m_Id - 1; }
  bool isNil() const { return m_Id == 0; }
  explicit operator bool() const { return m_Id != 0; }

  friend bool operator==(Handle a, Handle b) { return a.m_Id == b.m_Id; }
  friend bool operator!=(Handle a, Handle b) { return a.m_Id != b.m_Id; }
  friend bool operator==(Handle a, nil_t) { return a.m_Id == 0; }
  friend bool operator!=(Handle a, nil_t) { return a.m_Id != 0; }
  friend bool operator<(Handle a, Handle b) { return a.m_Id < b.m_Id; }

private:
  friend class ssaopt::graph;
  static Handle ofIndex(std::uint32_t index) { return Handle(index + 1); }
  explicit Handle(std::uint32_t id) : m_Id(id) {}

  std::uint32_t m_Id = 0;
};

struct NodeTag;
struct EdgeTag;

// Creation number of no node or edge: the end of a list.
inline constexpr std::uint32_t kNoRecord = 0xFFFFFFFFu;

struct NodeRecord {
  std::uint32_t prev = kNoRecord;  // in the graph's node list
  std::uint32_t next = kNoRecord;
  std::uint32_t firstOut = kNoRecord;
  std::uint32_t lastOut = kNoRecord;
  std::uint32_t firstIn = kNoRecord;
  std::uint32_t lastIn = kNoRecord;
  std::uint32_t outdeg = 0;
  std::uint32_t indeg = 0;
};

struct EdgeRecord {
  std::uint32_t source = kNoRecord;
  std::uint32_t target = kNoRecord;
  std::uint32_t prev = kNoRecord;  // in the graph's edge list
  std::uint32_t next = kNoRecord;
  std::uint32_t prevOut = kNoRecord;  // in the source's out-edge list
  std::uint32_t nextOut = kNoRecord;
  std::uint32_t prevIn = kNoRecord;  // in the target's in-edge list
  std::uint32_t nextIn = kNoRecord;
};

// Elements by number in chunks that never move: chunk 0 holds 16 elements and every further chunk
// as many as all before it, up to kLargest per chunk. So a small array (of a dominator tree, a call
// graph) takes little memory, a large one wastes less than one chunk, and growing copies nothing.
// Elements exist up to size() only.
template <class T>
class ChunkedArray {
public:
  ChunkedArray() = default;
  ChunkedArray(const ChunkedArray& other) { copyFrom(other); }
  ChunkedArray& operator=(const ChunkedArray& other) {
    if (this != &other) {
      clear();
      copyFrom(other);
    }
    return *this;
  }
  ~ChunkedArray() { clear(); }

  std::size_t size() const { return m_Size; }
  T& operator[](std::size_t i) {
    std::size_t chunk = chunkOf(i);
    return m_Chunks[chunk][i - startOf(chunk)];
  }
  const T& operator[](std::size_t i) const { return const_cast<ChunkedArray&>(*this)[i]; }

  // Adds elements equal to `value` up to `count`; never shrinks. True when a chunk was allocated.
  bool grow(std::size_t count, const T& value) {
    bool allocated = false;
    for (; m_Size < count; ++m_Size) {
      std::size_t chunk = chunkOf(m_Size);
      if (chunk == m_Chunks.size()) {
        m_Chunks.push_back(ModuleAllocator<T>().allocate(sizeOf(chunk)));
        allocated = true;
      }
      new (&m_Chunks[chunk][m_Size - startOf(chunk)]) T(value);
    }
    return allocated;
  }
  void clear() {
    for (std::size_t i = 0; i < m_Size; ++i) (*this)[i].~T();
    for (std::size_t chunk = 0; chunk < m_Chunks.size(); ++chunk)
      ModuleAllocator<T>().deallocate(m_Chunks[chunk], sizeOf(chunk));
    m_Chunks.clear();
    m_Size = 0;
  }

private:
  static constexpr unsigned kFirstShift = 4;
  static constexpr unsigned kLargestShift = 12;
  static constexpr std::size_t kLargest = std::size_t(1) << kLargestShift;
  // The chunks that double: 0 to kDoubling - 1, together holding kLargest elements.
  static constexpr std::size_t kDoubling = kLargestShift - kFirstShift + 1;

  static std::size_t chunkOf(std::size_t i) {
    if (i >= kLargest) return (i >> kLargestShift) + kDoubling - 1;
    if ((i >> kFirstShift) == 0) return 0;
    return 32 - static_cast<std::size_t>(__builtin_clz(static_cast<unsigned>(i >> kFirstShift)));
  }
  static std::size_t startOf(std::size_t chunk) {
    if (chunk >= kDoubling) return (chunk - kDoubling + 1) << kLargestShift;
    return chunk == 0 ? 0 : (std::size_t(1) << kFirstShift) << (chunk - 1);
  }
  static std::size_t sizeOf(std::size_t chunk) {
    if (chunk >= kDoubling) return kLargest;
    return chunk == 0 ? std::size_t(1) << kFirstShift : (std::size_t(1) << kFirstShift) << (chunk - 1);
  }

  void copyFrom(const ChunkedArray& other) {
    for (std::size_t i = 0; i < other.m_Size; ++i) grow(i + 1, other[i]);
  }

  array<T*> m_Chunks;
  std::size_t m_Size = 0;
};

// Records by creation number. Numbers below the base were cleared.
template <class Record>
class RecordStore {
public:
  Record& operator[](std::uint32_t number) { return m_Records[number - m_Base]; }
  const Record& operator[](std::uint32_t number) const { return m_Records[number - m_Base]; }
  // Makes room for record `number`, the next one to be created; true when that took new memory.
  bool reserve(std::uint32_t number) { return m_Records.grow(number - m_Base + 1, Record()); }
  // Gives back every record; the next one is number `nextBase`.
  void release(std::uint32_t nextBase) {
    m_Records.clear();
    m_Base = nextBase;
  }

private:
  ChunkedArray<Record> m_Records;
  std::uint32_t m_Base = 0;
};

}  // namespace detail

// Handle of a node. Its index is the node's creation number in its graph, unique for the graph's
// lifetime (never reused), so sets of nodes iterate in creation order.
using node = detail::Handle<detail::NodeTag>;
// Handle of an edge; its index is the edge's creation number in its graph.
using edge = detail::Handle<detail::EdgeTag>;

namespace detail {

// Forward iteration over an intrusive list of records that fetches the successor before yielding an
// element, so the loop body may delete the element it is given (but no other element of the same
// list).
template <class H, class Record, std::uint32_t Record::*Next>
class LinkRange {
public:
  class iterator {
  public:
    using iterator_category = std::forward_iterator_tag;
    using value_type = H;
    using difference_type = std::ptrdiff_t;
    using pointer = const H*;
    using reference = H;

    iterator(const RecordStore<Record>* pStore, std::uint32_t number)
        : m_pStore(pStore), m_Number(number), m_Next(nextOf(number)) {}
    H operator*() const { return graphHandle(m_Number); }
    iterator& operator++() {
      m_Number = m_Next;
      m_Next = nextOf(m_Number);
      return *this;
    }
    friend bool operator==(const iterator& a, const iterator& b) { return a.m_Number == b.m_Number; }
    friend bool operator!=(const iterator& a, const iterator& b) { return a.m_Number != b.m_Number; }

  private:
    std::uint32_t nextOf(std::uint32_t number) const {
      return number == kNoRecord ? kNoRecord : (*m_pStore)[number].*Next;
    }

    const RecordStore<Record>* m_pStore;
    std::uint32_t m_Number;
    std::uint32_t m_Next;
  };

  LinkRange(const RecordStore<Record>* pStore, std::uint32_t first) : m_pStore(pStore), m_First(first) {}
  iterator begin() const { return iterator(m_pStore, m_First); }
  iterator end() const { return iterator(m_pStore, kNoRecord); }

private:
  static H graphHandle(std::uint32_t number);

  const RecordStore<Record>* m_pStore;
  std::uint32_t m_First;
};

}  // namespace detail

// A directed graph. Copying builds a graph of the same shape whose nodes and edges are new (numbered
// afresh in the source's order).
class graph {
public:
  SSAOPT_MODULE_ALLOCATED

  using NodeRange = detail::LinkRange<node, detail::NodeRecord, &detail::NodeRecord::next>;
  using EdgeRange = detail::LinkRange<edge, detail::EdgeRecord, &detail::EdgeRecord::next>;
  using OutEdgeRange = detail::LinkRange<edge, detail::EdgeRecord, &detail::EdgeRecord::nextOut>;
  using InEdgeRange = detail::LinkRange<edge, detail::EdgeRecord, &detail::EdgeRecord::nextIn>;

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

  node source(edge e) const { return handleOf<node>(rec(e).source); }
  node target(edge e) const { return handleOf<node>(rec(e).target); }
  // The end of `e` that is not `v`.
  node opposite(node v, edge e) const { return source(e) == v ? target(e) : source(e); }
  int outdeg(node v) const { return static_cast<int>(rec(v).outdeg); }
  int indeg(node v) const { return static_cast<int>(rec(v).indeg); }
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
  node first_node() const { return handleOf<node>(m_FirstNode); }
  node last_node() const { return handleOf<node>(m_LastNode); }
  node next_node(node v) const { return handleOf<node>(rec(v).next); }
  node pred_node(node v) const { return handleOf<node>(rec(v).prev); }
  edge first_edge() const { return handleOf<edge>(m_FirstEdge); }
  edge last_edge() const { return handleOf<edge>(m_LastEdge); }
  edge next_edge(edge e) const { return handleOf<edge>(rec(e).next); }

  // Walks in adjacency order.
  edge first_adj_edge(node v) const { return handleOf<edge>(rec(v).firstOut); }
  edge last_adj_edge(node v) const { return handleOf<edge>(rec(v).lastOut); }
  edge adj_succ(edge e) const { return handleOf<edge>(rec(e).nextOut); }
  edge adj_pred(edge e) const { return handleOf<edge>(rec(e).prevOut); }
  edge first_in_edge(node v) const { return handleOf<edge>(rec(v).firstIn); }
  edge last_in_edge(node v) const { return handleOf<edge>(rec(v).lastIn); }
  edge in_succ(edge e) const { return handleOf<edge>(rec(e).nextIn); }
  edge in_pred(edge e) const { return handleOf<edge>(rec(e).prevIn); }

  // Copies, for walks that change the graph.
  list<node> all_nodes() const;
  list<edge> all_edges() const;
  list<edge> out_edges(node v) const;
  list<edge> in_edges(node v) const;

  // Live views without copying. The loop body may delete the element it is given, nothing else.
  NodeRange nodes() const { return NodeRange(&m_Nodes, m_FirstNode); }
  EdgeRange edges() const { return EdgeRange(&m_Edges, m_FirstEdge); }
  OutEdgeRange out(node v) const { return OutEdgeRange(&m_Edges, rec(v).firstOut); }
  InEdgeRange in(node v) const { return InEdgeRange(&m_Edges, rec(v).firstIn); }

  // Position of `e` among the in-edges of its target (0 for the first).
  int in_position(edge e) const;

  // The handle of creation number `number`, nil for kNoRecord; for the graph layer itself.
  template <class H>
  static H handleOf(std::uint32_t number) {
    return number == detail::kNoRecord ? H() : H::ofIndex(number);
  }

private:
  detail::NodeRecord& rec(node v) { return m_Nodes[v.index()]; }
  const detail::NodeRecord& rec(node v) const { return m_Nodes[v.index()]; }
  detail::EdgeRecord& rec(edge e) { return m_Edges[e.index()]; }
  const detail::EdgeRecord& rec(edge e) const { return m_Edges[e.index()]; }

  void copyShapeFrom(const graph& other);
  void linkOut(std::uint32_t e, std::uint32_t v);
  void unlinkOut(std::uint32_t e);
  void linkIn(std::uint32_t e, std::uint32_t w);
  void unlinkIn(std::uint32_t e);

  detail::RecordStore<detail::NodeRecord> m_Nodes;
  detail::RecordStore<detail::EdgeRecord> m_Edges;
  std::uint32_t m_FirstNode = detail::kNoRecord;
  std::uint32_t m_LastNode = detail::kNoRecord;
  std::uint32_t m_FirstEdge = detail::kNoRecord;
  std::uint32_t m_LastEdge = detail::kNoRecord;
  int m_NodeCount = 0;
  int m_EdgeCount = 0;
  std::uint32_t m_NextNodeIndex = 0;
  std::uint32_t m_NextEdgeIndex = 0;
  // Keeps the pools that served the nodes and edges from releasing their memory while the graph
  // lives; a copy holds what served its own nodes and edges.
  PoolHold m_PoolHold;
};

namespace detail {
template <class H, class Record, std::uint32_t Record::*Next>
H LinkRange<H, Record, Next>::graphHandle(std::uint32_t number) {
  return graph::handleOf<H>(number);
}
}  // namespace detail

// A value for every node (or edge) of a graph, indexed by creation number. Entries for nodes created
// after the array are added on first write with the array's default value.
template <class Handle, class T>
class handle_array {
public:
  handle_array() = default;
  explicit handle_array(const graph& G, const T& init = T()) { this->init(G, init); }
  handle_array(std::size_t size, const T& init) : m_Default(init) { m_Slots.grow(size, init); }

  void init(const graph& G, const T& init = T()) {
    m_Default = init;
    m_Slots.clear();
    m_Slots.grow(slotsFor(G), init);
  }
  // Sets every entry back to the default value, keeping the size.
  void fill(const T& value) {
    m_Default = value;
    for (std::size_t i = 0; i < m_Slots.size(); ++i) m_Slots[i] = value;
  }

  T& operator[](Handle h) {
    if (h.index() >= m_Slots.size()) m_Slots.grow(h.index() + 1, m_Default);
    return m_Slots[h.index()];
  }
  const T& operator[](Handle h) const { return h.index() < m_Slots.size() ? m_Slots[h.index()] : m_Default; }

private:
  static std::size_t slotsFor(const graph& G);

  T m_Default{};
  detail::ChunkedArray<T> m_Slots;
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

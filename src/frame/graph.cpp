#include "ssaopt/frame/graph.h"

namespace ssaopt {

using detail::EdgeRecord;
using detail::kNoRecord;
using detail::NodeRecord;

graph::graph(const graph& other) : graph() { copyShapeFrom(other); }

graph& graph::operator=(const graph& other) {
  if (this != &other) {
    clear();
    copyShapeFrom(other);
  }
  return *this;
}

graph::~graph() { clear(); }

void graph::copyShapeFrom(const graph& other) {
  node_array<node> copyOf(other, node());
  for (node v : other.nodes()) copyOf[v] = new_node();
  for (edge e : other.edges()) new_edge(copyOf[other.source(e)], copyOf[other.target(e)]);
}

node graph::new_node() {
  std::uint32_t v = m_NextNodeIndex;
  if (m_Nodes.reserve(v)) m_PoolHold.holdLatest();
  ++m_NextNodeIndex;
  NodeRecord& record = m_Nodes[v];
  record = NodeRecord();
  record.prev = m_LastNode;
  (m_LastNode != kNoRecord ? m_Nodes[m_LastNode].next : m_FirstNode) = v;
  m_LastNode = v;
  ++m_NodeCount;
  return handleOf<node>(v);
}

edge graph::new_edge(node v, node w) {
  std::uint32_t e = m_NextEdgeIndex;
  if (m_Edges.reserve(e)) m_PoolHold.holdLatest();
  ++m_NextEdgeIndex;
  EdgeRecord& record = m_Edges[e];
  record = EdgeRecord();
  record.prev = m_LastEdge;
  (m_LastEdge != kNoRecord ? m_Edges[m_LastEdge].next : m_FirstEdge) = e;
  m_LastEdge = e;
  ++m_EdgeCount;
  linkOut(e, v.index());
  linkIn(e, w.index());
  return handleOf<edge>(e);
}

void graph::del_edge(edge handle) {
  std::uint32_t e = handle.index();
  unlinkOut(e);
  unlinkIn(e);
  EdgeRecord& record = m_Edges[e];
  (record.prev != kNoRecord ? m_Edges[record.prev].next : m_FirstEdge) = record.next;
  (record.next != kNoRecord ? m_Edges[record.next].prev : m_LastEdge) = record.prev;
  record = EdgeRecord();
  --m_EdgeCount;
}

void graph::del_node(node handle) {
  std::uint32_t v = handle.index();
  while (m_Nodes[v].firstOut != kNoRecord) del_edge(handleOf<edge>(m_Nodes[v].firstOut));
  while (m_Nodes[v].firstIn != kNoRecord) del_edge(handleOf<edge>(m_Nodes[v].firstIn));
  NodeRecord& record = m_Nodes[v];
  (record.prev != kNoRecord ? m_Nodes[record.prev].next : m_FirstNode) = record.next;
  (record.next != kNoRecord ? m_Nodes[record.next].prev : m_LastNode) = record.prev;
  record = NodeRecord();
  --m_NodeCount;
}

void graph::move_edge(edge handle, node v, node w) {
  std::uint32_t e = handle.index();
  if (m_Edges[e].source != v.index()) {
    unlinkOut(e);
    linkOut(e, v.index());
  }
  if (m_Edges[e].target != w.index()) {
    unlinkIn(e);
    linkIn(e, w.index());
  }
}

void graph::clear() {
  m_Nodes.release(m_NextNodeIndex);
  m_Edges.release(m_NextEdgeIndex);
  m_FirstNode = m_LastNode = kNoRecord;
  m_FirstEdge = m_LastEdge = kNoRecord;
  m_NodeCount = m_EdgeCount = 0;
}

list<node> graph::all_nodes() const {
  list<node> result;
  for (node v : nodes()) result.push_back(v);
  return result;
}

list<edge> graph::all_edges() const {
  list<edge> result;
  for (edge e : edges()) result.push_back(e);
  return result;
}

list<edge> graph::out_edges(node v) const {
  list<edge> result;
  for (edge e : out(v)) result.push_back(e);
  return result;
}

list<edge> graph::in_edges(node v) const {
  list<edge> result;
  for (edge e : in(v)) result.push_back(e);
  return result;
}

int graph::in_position(edge handle) const {
  int position = 0;
  for (std::uint32_t e = m_Edges[handle.index()].prevIn; e != kNoRecord; e = m_Edges[e].prevIn) ++position;
  return position;
}

void graph::linkOut(std::uint32_t e, std::uint32_t v) {
  EdgeRecord& record = m_Edges[e];
  NodeRecord& source = m_Nodes[v];
  record.source = v;
  record.nextOut = kNoRecord;
  record.prevOut = source.lastOut;
  (source.lastOut != kNoRecord ? m_Edges[source.lastOut].nextOut : source.firstOut) = e;
  source.lastOut = e;
  ++source.outdeg;
}

void graph::unlinkOut(std::uint32_t e) {
  EdgeRecord& record = m_Edges[e];
  NodeRecord& source = m_Nodes[record.source];
  (record.prevOut != kNoRecord ? m_Edges[record.prevOut].nextOut : source.firstOut) = record.nextOut;
  (record.nextOut != kNoRecord ? m_Edges[record.nextOut].prevOut : source.lastOut) = record.prevOut;
  --source.outdeg;
}

void graph::linkIn(std::uint32_t e, std::uint32_t w) {
  EdgeRecord& record = m_Edges[e];
  NodeRecord& target = m_Nodes[w];
  record.target = w;
  record.nextIn = kNoRecord;
  record.prevIn = target.lastIn;
  (target.lastIn != kNoRecord ? m_Edges[target.lastIn].nextIn : target.firstIn) = e;
  target.lastIn = e;
  ++target.indeg;
}

void graph::unlinkIn(std::uint32_t e) {
  EdgeRecord& record = m_Edges[e];
  NodeRecord& target = m_Nodes[record.target];
  (record.prevIn != kNoRecord ? m_Edges[record.prevIn].nextIn : target.firstIn) = record.nextIn;
  (record.nextIn != kNoRecord ? m_Edges[record.nextIn].prevIn : target.lastIn) = record.prevIn;
  --target.indeg;
}

}  // namespace ssaopt

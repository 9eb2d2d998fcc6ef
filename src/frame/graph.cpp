#include "ssaopt/frame/graph.h"

namespace ssaopt {

using detail::EdgeRep;
using detail::NodeRep;

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
  NodeRep* v = new NodeRep;
  m_PoolHold.holdLatest();
  v->index = m_NextNodeIndex++;
  v->prev = m_pLastNode;
  (m_pLastNode ? m_pLastNode->next : m_pFirstNode) = v;
  m_pLastNode = v;
  ++m_NodeCount;
  return makeHandle(v);
}

edge graph::new_edge(node v, node w) {
  EdgeRep* e = new EdgeRep;
  m_PoolHold.holdLatest();
  e->index = m_NextEdgeIndex++;
  e->prev = m_pLastEdge;
  (m_pLastEdge ? m_pLastEdge->next : m_pFirstEdge) = e;
  m_pLastEdge = e;
  ++m_EdgeCount;
  linkOut(e, v.m_pRep);
  linkIn(e, w.m_pRep);
  return makeHandle(e);
}

void graph::del_edge(edge handle) {
  EdgeRep* e = handle.m_pRep;
  unlinkOut(e);
  unlinkIn(e);
  (e->prev ? e->prev->next : m_pFirstEdge) = e->next;
  (e->next ? e->next->prev : m_pLastEdge) = e->prev;
  --m_EdgeCount;
  delete e;
}

void graph::del_node(node handle) {
  NodeRep* v = handle.m_pRep;
  while (v->firstOut) del_edge(makeHandle(v->firstOut));
  while (v->firstIn) del_edge(makeHandle(v->firstIn));
  (v->prev ? v->prev->next : m_pFirstNode) = v->next;
  (v->next ? v->next->prev : m_pLastNode) = v->prev;
  --m_NodeCount;
  delete v;
}

void graph::move_edge(edge handle, node v, node w) {
  EdgeRep* e = handle.m_pRep;
  if (e->source != v.m_pRep) {
    unlinkOut(e);
    linkOut(e, v.m_pRep);
  }
  if (e->target != w.m_pRep) {
    unlinkIn(e);
    linkIn(e, w.m_pRep);
  }
}

void graph::clear() {
  for (EdgeRep* e = m_pFirstEdge; e;) {
    EdgeRep* next = e->next;
    delete e;
    e = next;
  }
  for (NodeRep* v = m_pFirstNode; v;) {
    NodeRep* next = v->next;
    delete v;
    v = next;
  }
  m_pFirstNode = m_pLastNode = nullptr;
  m_pFirstEdge = m_pLastEdge = nullptr;
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
  for (EdgeRep* e = handle.m_pRep->prevIn; e; e = e->prevIn) ++position;
  return position;
}

void graph::linkOut(EdgeRep* e, NodeRep* v) {
  e->source = v;
  e->nextOut = nullptr;
  e->prevOut = v->lastOut;
  (v->lastOut ? v->lastOut->nextOut : v->firstOut) = e;
  v->lastOut = e;
  ++v->outdeg;
}

void graph::unlinkOut(EdgeRep* e) {
  NodeRep* v = e->source;
  (e->prevOut ? e->prevOut->nextOut : v->firstOut) = e->nextOut;
  (e->nextOut ? e->nextOut->prevOut : v->lastOut) = e->prevOut;
  --v->outdeg;
}

void graph::linkIn(EdgeRep* e, NodeRep* w) {
  e->target = w;
  e->nextIn = nullptr;
  e->prevIn = w->lastIn;
  (w->lastIn ? w->lastIn->nextIn : w->firstIn) = e;
  w->lastIn = e;
  ++w->indeg;
}

void graph::unlinkIn(EdgeRep* e) {
  NodeRep* w = e->target;
  (e->prevIn ? e->prevIn->nextIn : w->firstIn) = e->nextIn;
  (e->nextIn ? e->nextIn->prevIn : w->lastIn) = e->prevIn;
  --w->indeg;
}

}  // namespace ssaopt

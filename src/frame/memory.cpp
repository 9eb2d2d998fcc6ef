#include "ssaopt/frame/memory.h"

#include "pool_arena.h"
#include "ssaopt/frame/pool.h"

KvCMemController* pKVMemory = nullptr;

namespace ssaopt {

namespace {

using detail::PoolArena;

// The open sessions, innermost first. Kept in plain pointers, so that controls destroyed during the
// program's exit still find a valid (empty) list.
struct Session {
  const void* owner;
  PoolArena* arena;
  Session* outer;
};
Session* g_pSessions = nullptr;

// Serves allocations outside every session; it lasts until the program ends.
PoolArena* g_pDefaultArena = nullptr;

Session** findSession(const void* owner) {
  Session** link = &g_pSessions;
  while (*link && (*link)->owner != owner) link = &(*link)->outer;
  return link;
}

void closeSession(Session** link, bool reportGraphs) {
  Session* session = *link;
  *link = session->outer;
  PoolArena::end(session->arena, reportGraphs);
  delete session;
}

PoolArena& servingArena() {
  if (g_pSessions) return *g_pSessions->arena;
  if (!g_pDefaultArena) g_pDefaultArena = PoolArena::create();
  return *g_pDefaultArena;
}

}  // namespace

void* moduleAllocate(std::size_t size) {
  if (size == 0) size = 1;  // a controller may answer 0 bytes with null, which operator new must not.
  if (!pKVMemory) return servingArena().allocate(size);
  detail::g_pLatestArena = nullptr;  // a PoolMemController sets it again
  void* block = pKVMemory->allocMemBlock(static_cast<unsigned long>(size));
  if (!block) throw std::bad_alloc();
  return block;
}

void moduleFree(void* block) noexcept {
  if (!block) return;
  if (pKVMemory)
    pKVMemory->freeMemBlock(block);
  else
    PoolArena::freeBlock(block);
}

std::size_t poolBytesReserved() { return PoolArena::reservedByAll(); }

namespace detail {

void beginSession(const void* owner) {
  if (pKVMemory || *findSession(owner)) return;
  g_pSessions = new Session{owner, PoolArena::create(), g_pSessions};
}

void endSession(const void* owner) {
  Session** link = findSession(owner);
  if (*link) closeSession(link, true);
}

// Graphs with static storage that still hold a pool at the end keep it: it stays with the program's
// other static memory.
void endModulePools() {
  while (g_pSessions) closeSession(&g_pSessions, false);
  if (g_pDefaultArena) PoolArena::end(g_pDefaultArena, false);
  g_pDefaultArena = nullptr;
}

}  // namespace detail

}  // namespace ssaopt

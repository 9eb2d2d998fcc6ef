#include "ssaopt/frame/pool.h"

#include "pool_arena.h"

namespace ssaopt {

namespace {

constexpr int kCodeDestroyedWhileInstalled = 3;

}  // namespace

PoolMemController::PoolMemController() : m_pArena(detail::PoolArena::create()) {}

// A pool destroyed while still installed would leave pKVMemory dangling: it is uninstalled, so that
// later allocations come from the module's own pools.
PoolMemController::~PoolMemController() {
  if (pKVMemory == this) {
    detail::reportPoolMisuse(kCodeDestroyedWhileInstalled,
                             "a memory controller is no longer installed when it is destroyed");
    pKVMemory = nullptr;
  }
  detail::PoolArena::end(m_pArena, true);
}

void* PoolMemController::allocMemBlock(unsigned long size) { return m_pArena->allocate(size); }

// The block goes back to the pool that handed it out, which need not be this one.
void PoolMemController::freeMemBlock(void* block) { detail::PoolArena::freeBlock(block); }

std::size_t PoolMemController::blocksInUse() const { return m_pArena->blocksInUse(); }
std::size_t PoolMemController::bytesInUse() const { return m_pArena->bytesInUse(); }
std::size_t PoolMemController::peakBytes() const { return m_pArena->peakBytes(); }
std::size_t PoolMemController::bytesReserved() const { return m_pArena->bytesReserved(); }

}  // namespace ssaopt

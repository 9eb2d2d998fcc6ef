// A pooling memory controller for hosts to install as pKVMemory. Small blocks come from size-class
// free lists carved out of large chunks; large blocks come from the heap one by one. It keeps account
// of blocks and bytes in use and of the peak, and releases everything it ever handed out when it is
// destroyed, so a run leaks nothing even though the graph by design deletes no payload. The module's
// own pools (see memory.h) work the same way.
//
// A block goes back to the pool that handed it out, whichever pool (or none) is installed when it is
// freed. A pool destroyed while a graph still holds blocks of it is reported and keeps its memory
// until the last such graph is gone; other library objects go before their pool ends.
#pragma once

#include <cstddef>

#include "ssaopt/frame/memory.h"

namespace ssaopt {

class PoolMemController : public KvCMemController {
public:
  PoolMemController();
  ~PoolMemController() override;
  PoolMemController(const PoolMemController&) = delete;
  PoolMemController& operator=(const PoolMemController&) = delete;

  void* allocMemBlock(unsigned long size) override;
  void freeMemBlock(void* block) override;

  // Blocks handed out and not yet freed, with the bytes requested for them.
  std::size_t blocksInUse() const;
  std::size_t bytesInUse() const;
  // The largest bytesInUse() seen so far.
  std::size_t peakBytes() const;
  // Bytes obtained from the heap for chunks and large blocks.
  std::size_t bytesReserved() const;

  // Installs a controller as pKVMemory for the lifetime of this object and restores the previous
  // one afterwards.
  class Scope {
  public:
    explicit Scope(KvCMemController* controller) : m_pPrevious(pKVMemory) { pKVMemory = controller; }
    ~Scope() { pKVMemory = m_pPrevious; }
    Scope(const Scope&) = delete;
    Scope& operator=(const Scope&) = delete;

  private:
    KvCMemController* m_pPrevious;
  };

private:
  detail::PoolArena* m_pArena;
};

// Bytes that all pools hold from the heap: the module's own and those of every PoolMemController,
// including pools kept for graphs that outlived them.
std::size_t poolBytesReserved();

}  // namespace ssaopt

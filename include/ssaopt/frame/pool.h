// A pooling memory controller for hosts to install as pKVMemory. Small blocks come from size-class
// free lists carved out of large chunks; large blocks come from the heap one by one. It keeps account
// of blocks and bytes in use and of the peak, and releases everything it ever handed out when it is
// destroyed, so a whole run leaks nothing even though the graph by design deletes no payload.
#pragma once

#include <cstddef>
#include <cstdint>

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
  std::size_t blocksInUse() const { return m_BlocksInUse; }
  std::size_t bytesInUse() const { return m_BytesInUse; }
  // The largest bytesInUse() seen so far.
  std::size_t peakBytes() const { return m_PeakBytes; }
  // Bytes obtained from the heap for chunks and large blocks.
  std::size_t bytesReserved() const { return m_BytesReserved; }

  // Installs a controller as pKVMemory for the lifetime of this object and restores the previous
  // one afterwards; the controller must outlive every library object made meanwhile.
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
  struct Header;
  struct FreeBlock {
    FreeBlock* next;
  };
  struct LargeBlock;

  static constexpr std::size_t kGranule = 16;     // size classes are multiples of this
  static constexpr std::size_t kClasses = 32;     // so blocks up to 512 bytes are pooled
  static constexpr std::size_t kChunkBytes = 1 << 16;

  void* allocSmall(std::size_t sizeClass);
  void* allocLarge(std::size_t size);
  void refill(std::size_t sizeClass);

  FreeBlock* m_FreeLists[kClasses] = {};
  void* m_pChunks = nullptr;          // chunks, linked through their first word
  LargeBlock* m_pLargeBlocks = nullptr;  // doubly linked, so freeing one is O(1)
  std::size_t m_BlocksInUse = 0;
  std::size_t m_BytesInUse = 0;
  std::size_t m_PeakBytes = 0;
  std::size_t m_BytesReserved = 0;
};

}  // namespace ssaopt

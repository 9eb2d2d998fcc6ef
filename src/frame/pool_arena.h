// The memory of a pool, behind PoolMemController and the module's own pools.
//
// Small blocks come from size-class free lists carved out of 64 KiB chunks, large ones from the heap
// one by one. Every block is preceded by a header that names its arena, so a block goes back to the
// arena that handed it out, whatever controller is installed when it is freed; a freed small block's
// header is marked, so freeing it again is caught. Built with AddressSanitizer, every block is a heap
// block of its own, so that the sanitizer sees each object's bounds and lifetime.
//
// An arena ends when its owner does. It then releases everything it ever handed out, unless a graph
// still holds blocks of it (PoolHold): such an arena is reported, retired, and released at the next
// sweep after the last graph let go of it.
#pragma once

#include <cstddef>
#include <cstdint>

namespace ssaopt::detail {

class PoolArena {
public:
  // A new arena; idle retired arenas are released first.
  static PoolArena* create();
  // The owner is done with `arena`. When graphs still hold it, it is retired (reported when
  // `reportGraphs` is set) instead of released.
  static void end(PoolArena* arena, bool reportGraphs);
  // Releases the retired arenas that no graph holds any more.
  static void releaseIdle();
  // Returns a block to the arena that handed it out. A block that no arena handed out, or one freed
  // twice, is reported and left alone.
  static void freeBlock(void* block);
  // Bytes that all arenas, retired ones included, hold from the heap.
  static std::size_t reservedByAll() { return s_ReservedByAll; }

  PoolArena(const PoolArena&) = delete;
  PoolArena& operator=(const PoolArena&) = delete;

  void* allocate(std::size_t size);

  std::size_t blocksInUse() const { return m_BlocksInUse; }
  std::size_t bytesInUse() const { return m_BytesInUse; }
  std::size_t peakBytes() const { return m_PeakBytes; }
  std::size_t bytesReserved() const { return m_BytesReserved; }

  void hold() { ++m_Holds; }
  void letGo() { --m_Holds; }

private:
  struct Header;
  struct LargeBlock;

  static constexpr std::size_t kGranule = 16;  // size classes are multiples of this
  static constexpr std::size_t kClasses = 32;  // so blocks up to 496 bytes are pooled
  static constexpr std::size_t kChunkBytes = 1 << 16;

  PoolArena() = default;
  ~PoolArena();

  void release(Header* header);
  Header* takeSmall(std::size_t sizeClass);
  Header* takeLarge(std::size_t size);
  void refill(std::size_t sizeClass);
  void reserve(std::size_t bytes);
  void unreserve(std::size_t bytes);

  static std::size_t s_ReservedByAll;
  static PoolArena* s_pRetired;  // linked through m_pNextRetired

  Header* m_FreeLists[kClasses] = {};
  void* m_pChunks = nullptr;             // chunks, linked through their first word
  LargeBlock* m_pLargeBlocks = nullptr;  // doubly linked, so freeing one is O(1)
  std::size_t m_BlocksInUse = 0;
  std::size_t m_BytesInUse = 0;
  std::size_t m_PeakBytes = 0;
  std::size_t m_BytesReserved = 0;
  std::size_t m_Holds = 0;  // graphs that hold blocks of this arena
  PoolArena* m_pNextRetired = nullptr;
};

// Reports a misuse of the pools through the host's internal error report, with the condition that
// failed while internal information is on.
void reportPoolMisuse(int code, const char* condition);

// Module sessions: KvCSSAControl::boot() opens one with a pool of its own when no host controller is
// installed, shutdown() (or the control's destruction) ends it and its pool.
void beginSession(const void* owner);
void endSession(const void* owner);
// Ends the module's own pools at the end of the program, without reports.
void endModulePools();

}  // namespace ssaopt::detail

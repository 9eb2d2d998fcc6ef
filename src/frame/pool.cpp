#include "ssaopt/frame/pool.h"

#include <algorithm>
#include <cstdlib>
#include <new>

namespace ssaopt {

// Every block is preceded by a header that records its size class (or 0 for a large block) and the
// size requested, so freeMemBlock needs nothing but the pointer. 16 bytes keep blocks aligned for any
// fundamental type.
struct PoolMemController::Header {
  std::uint32_t sizeClass;  // 1..kClasses, 0 for a large block
  std::uint32_t unused;
  std::uint64_t requested;
};

struct PoolMemController::LargeBlock {
  LargeBlock* prev;
  LargeBlock* next;
};

PoolMemController::PoolMemController() {
  static_assert(sizeof(Header) == kGranule, "the header keeps blocks 16-byte aligned");
  static_assert(sizeof(LargeBlock) == kGranule, "the large-block links keep blocks 16-byte aligned");
}

PoolMemController::~PoolMemController() {
  while (m_pChunks) {
    void* next = *static_cast<void**>(m_pChunks);
    std::free(m_pChunks);
    m_pChunks = next;
  }
  while (m_pLargeBlocks) {
    LargeBlock* next = m_pLargeBlocks->next;
    std::free(m_pLargeBlocks);
    m_pLargeBlocks = next;
  }
}

void* PoolMemController::allocMemBlock(unsigned long size) {
  std::size_t total = size + sizeof(Header);
  std::size_t sizeClass = (total + kGranule - 1) / kGranule;
  Header* header = static_cast<Header*>(sizeClass <= kClasses ? allocSmall(sizeClass) : allocLarge(total));
  header->sizeClass = sizeClass <= kClasses ? static_cast<std::uint32_t>(sizeClass) : 0;
  header->requested = size;
  ++m_BlocksInUse;
  m_BytesInUse += size;
  m_PeakBytes = std::max(m_PeakBytes, m_BytesInUse);
  return header + 1;
}

void PoolMemController::freeMemBlock(void* block) {
  if (!block) return;
  Header* header = static_cast<Header*>(block) - 1;
  --m_BlocksInUse;
  m_BytesInUse -= header->requested;
  if (header->sizeClass == 0) {
    LargeBlock* large = reinterpret_cast<LargeBlock*>(header) - 1;
    (large->prev ? large->prev->next : m_pLargeBlocks) = large->next;
    if (large->next) large->next->prev = large->prev;
    m_BytesReserved -= header->requested + sizeof(Header) + sizeof(LargeBlock);
    std::free(large);
    return;
  }
  // The free-list link overwrites the header, so take the size class first.
  FreeBlock*& head = m_FreeLists[header->sizeClass - 1];
  FreeBlock* freed = reinterpret_cast<FreeBlock*>(header);
  freed->next = head;
  head = freed;
}

void* PoolMemController::allocSmall(std::size_t sizeClass) {
  FreeBlock*& head = m_FreeLists[sizeClass - 1];
  if (!head) refill(sizeClass);
  FreeBlock* block = head;
  head = block->next;
  return block;
}

void* PoolMemController::allocLarge(std::size_t size) {
  void* raw = std::malloc(sizeof(LargeBlock) + size);
  if (!raw) throw std::bad_alloc();
  LargeBlock* large = static_cast<LargeBlock*>(raw);
  large->prev = nullptr;
  large->next = m_pLargeBlocks;
  if (m_pLargeBlocks) m_pLargeBlocks->prev = large;
  m_pLargeBlocks = large;
  m_BytesReserved += sizeof(LargeBlock) + size;
  return large + 1;
}

// Carves a new chunk into blocks of one size class. The chunk's first granule links it into the
// chunk list.
void PoolMemController::refill(std::size_t sizeClass) {
  void* chunk = std::malloc(kChunkBytes);
  if (!chunk) throw std::bad_alloc();
  *static_cast<void**>(chunk) = m_pChunks;
  m_pChunks = chunk;
  m_BytesReserved += kChunkBytes;
  std::size_t blockBytes = sizeClass * kGranule;
  char* first = static_cast<char*>(chunk) + kGranule;
  std::size_t count = (kChunkBytes - kGranule) / blockBytes;
  // Link back to front so that blocks are handed out in ascending address order.
  FreeBlock*& head = m_FreeLists[sizeClass - 1];
  for (std::size_t i = count; i-- > 0;) {
    FreeBlock* block = reinterpret_cast<FreeBlock*>(first + i * blockBytes);
    block->next = head;
    head = block;
  }
}

}  // namespace ssaopt

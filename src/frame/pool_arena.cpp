#include "pool_arena.h"

#include <algorithm>
#include <cstdlib>
#include <limits>
#include <new>

#include "ssaopt/frame/memory.h"
#include "ssaopt/frame/report.h"

#if defined(__SANITIZE_ADDRESS__)
#define SSAOPT_ADDRESS_SANITIZER 1
#elif defined(__has_feature)
#if __has_feature(address_sanitizer)
#define SSAOPT_ADDRESS_SANITIZER 1
#endif
#endif

namespace ssaopt {

namespace detail {

PoolArena* g_pLatestArena = nullptr;

namespace {

#ifdef SSAOPT_ADDRESS_SANITIZER
constexpr bool kPoolsSmallBlocks = false;
#else
constexpr bool kPoolsSmallBlocks = true;
#endif

// The tag of a block in use carries this mark above its size class; a freed small block carries
// kFreedTag instead. Anything else in front of a freed pointer is not a block of a pool.
constexpr std::uint32_t kTagMask = 0xFFFFFF00u;
constexpr std::uint32_t kLiveTag = 0x5A0C1A00u;
constexpr std::uint32_t kFreedTag = 0xF4EED000u;

constexpr const char* kClassName = "PoolMemController";
constexpr int kCodeGraphOutlivesPool = 1;
constexpr int kCodeForeignBlock = 2;

}  // namespace

// 16 bytes, so blocks stay aligned for any fundamental type. A freed small block links its free list
// through `nextFree`.
struct PoolArena::Header {
  std::uint32_t tag;        // kLiveTag | size class (0 for a large block), or kFreedTag
  std::uint32_t requested;  // bytes requested for a small block
  union {
    PoolArena* arena;
    Header* nextFree;
  };
};

struct PoolArena::LargeBlock {
  LargeBlock* prev;
  LargeBlock* next;
  std::size_t requested;
  std::size_t unused;
};

std::size_t PoolArena::s_ReservedByAll = 0;
PoolArena* PoolArena::s_pRetired = nullptr;

void reportPoolMisuse(int code, const char* condition) {
  if (ShowInternalInfo()) reportConsistencyFailure(kClassName, code, condition);
  reportInternalError(kClassName, code);
}

namespace {

// At the end of the program the module's own pools go, and every retired pool that no graph holds
// any more. Set up with the first pool, so that it runs after the destructors of every static object
// made with the pools.
void releaseAtExit() {
  static struct Release {
    ~Release() {
      endModulePools();
      PoolArena::releaseIdle();
    }
  } release;
}

}  // namespace

PoolArena* PoolArena::create() {
  static_assert(sizeof(Header) == kGranule, "the header keeps blocks 16-byte aligned");
  static_assert(sizeof(LargeBlock) % kGranule == 0, "the large-block links keep blocks 16-byte aligned");
  releaseAtExit();
  releaseIdle();
  return new PoolArena;
}

void PoolArena::end(PoolArena* arena, bool reportGraphs) {
  if (arena->m_Holds == 0) {
    delete arena;
  } else {
    if (reportGraphs)
      reportPoolMisuse(kCodeGraphOutlivesPool, "no graph holds blocks of a memory pool that ends");
    arena->m_pNextRetired = s_pRetired;
    s_pRetired = arena;
  }
  releaseIdle();
}

void PoolArena::releaseIdle() {
  for (PoolArena** link = &s_pRetired; *link;) {
    PoolArena* arena = *link;
    if (arena->m_Holds) {
      link = &arena->m_pNextRetired;
    } else {
      *link = arena->m_pNextRetired;
      delete arena;
    }
  }
}

void PoolArena::freeBlock(void* block) {
  if (!block) return;
  Header* header = static_cast<Header*>(block) - 1;
  if ((header->tag & kTagMask) != kLiveTag) {
    reportPoolMisuse(kCodeForeignBlock, "a freed block is in use and was handed out by a memory pool");
    return;
  }
  header->arena->release(header);
}

PoolArena::~PoolArena() {
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
  s_ReservedByAll -= m_BytesReserved;
  if (g_pLatestArena == this) g_pLatestArena = nullptr;
}

void* PoolArena::allocate(std::size_t size) {
  if (size > std::numeric_limits<std::size_t>::max() - sizeof(LargeBlock) - sizeof(Header))
    throw std::bad_alloc();
  std::size_t sizeClass = (size + sizeof(Header) + kGranule - 1) / kGranule;
  bool small = kPoolsSmallBlocks && sizeClass <= kClasses;
  Header* header = small ? takeSmall(sizeClass) : takeLarge(size);
  header->tag = kLiveTag | (small ? static_cast<std::uint32_t>(sizeClass) : 0u);
  header->requested = small ? static_cast<std::uint32_t>(size) : 0u;
  header->arena = this;
  ++m_BlocksInUse;
  m_BytesInUse += size;
  m_PeakBytes = std::max(m_PeakBytes, m_BytesInUse);
  g_pLatestArena = this;
  return header + 1;
}

void PoolArena::release(Header* header) {
  std::size_t sizeClass = header->tag & ~kTagMask;
  --m_BlocksInUse;
  if (sizeClass == 0) {
    LargeBlock* large = reinterpret_cast<LargeBlock*>(header) - 1;
    m_BytesInUse -= large->requested;
    (large->prev ? large->prev->next : m_pLargeBlocks) = large->next;
    if (large->next) large->next->prev = large->prev;
    unreserve(sizeof(LargeBlock) + sizeof(Header) + large->requested);
    std::free(large);
    return;
  }
  m_BytesInUse -= header->requested;
  header->tag = kFreedTag;
  header->nextFree = m_FreeLists[sizeClass - 1];
  m_FreeLists[sizeClass - 1] = header;
}

PoolArena::Header* PoolArena::takeSmall(std::size_t sizeClass) {
  Header*& head = m_FreeLists[sizeClass - 1];
  if (!head) refill(sizeClass);
  Header* block = head;
  head = block->nextFree;
  return block;
}

PoolArena::Header* PoolArena::takeLarge(std::size_t size) {
  std::size_t total = sizeof(LargeBlock) + sizeof(Header) + size;
  LargeBlock* large = static_cast<LargeBlock*>(std::malloc(total));
  if (!large) throw std::bad_alloc();
  large->prev = nullptr;
  large->next = m_pLargeBlocks;
  large->requested = size;
  if (m_pLargeBlocks) m_pLargeBlocks->prev = large;
  m_pLargeBlocks = large;
  reserve(total);
  return reinterpret_cast<Header*>(large + 1);
}

// Carves a new chunk into blocks of one size class. The chunk's first granule links it into the
// chunk list.
void PoolArena::refill(std::size_t sizeClass) {
  void* chunk = std::malloc(kChunkBytes);
  if (!chunk) throw std::bad_alloc();
  *static_cast<void**>(chunk) = m_pChunks;
  m_pChunks = chunk;
  reserve(kChunkBytes);
  std::size_t blockBytes = sizeClass * kGranule;
  char* first = static_cast<char*>(chunk) + kGranule;
  std::size_t count = (kChunkBytes - kGranule) / blockBytes;
  // Link back to front so that blocks are handed out in ascending address order.
  Header*& head = m_FreeLists[sizeClass - 1];
  for (std::size_t i = count; i-- > 0;) {
    Header* block = reinterpret_cast<Header*>(first + i * blockBytes);
    block->tag = kFreedTag;
    block->nextFree = head;
    head = block;
  }
}

void PoolArena::reserve(std::size_t bytes) {
  m_BytesReserved += bytes;
  s_ReservedByAll += bytes;
}

void PoolArena::unreserve(std::size_t bytes) {
  m_BytesReserved -= bytes;
  s_ReservedByAll -= bytes;
}

}  // namespace detail

PoolHold::~PoolHold() {
  for (detail::PoolArena* arena : m_Arenas) arena->letGo();
}

void PoolHold::hold(detail::PoolArena* arena) {
  m_pRecent = arena;
  if (!arena || std::find(m_Arenas.begin(), m_Arenas.end(), arena) != m_Arenas.end()) return;
  m_Arenas.push_back(arena);
  arena->hold();
}

}  // namespace ssaopt

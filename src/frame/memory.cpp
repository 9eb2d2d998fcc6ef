#include "ssaopt/frame/memory.h"

#include <cstdlib>

KvCMemController* pKVMemory = nullptr;

namespace ssaopt {

void* moduleAllocate(std::size_t size) {
  if (size == 0) size = 1;  // malloc(0) may return null, which operator new must not.
  void* block = pKVMemory ? pKVMemory->allocMemBlock(static_cast<unsigned long>(size)) : std::malloc(size);
  if (!block) throw std::bad_alloc();
  return block;
}

void moduleFree(void* block) noexcept {
  if (!block) return;
  if (pKVMemory)
    pKVMemory->freeMemBlock(block);
  else
    std::free(block);
}

}  // namespace ssaopt

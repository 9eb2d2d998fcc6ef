// The module's allocation rule: every object and container of the library obtains its memory from the
// host's memory controller when one is installed (pKVMemory non-null) and from the C run-time heap
// otherwise. The pointer is read anew at every allocation and deallocation.
//
// Nothing global is replaced: the rule is carried by class-level operator new/delete on the library's
// root classes (SSAOPT_MODULE_ALLOCATED) and by ModuleAllocator in every container, so the host's own
// objects keep the host's allocator whatever pKVMemory says.
#pragma once

#include <cstddef>
#include <new>

// The host's memory controller interface.
class KvCMemController {
public:
  virtual ~KvCMemController() = default;
  // Returns a block of at least `size` bytes.
  virtual void* allocMemBlock(unsigned long size) = 0;
  // Releases a block that allocMemBlock handed out.
  virtual void freeMemBlock(void* block) = 0;
};

// The host's global memory controller, or null for the C run-time heap. It must not change between
// null and non-null while objects of the library are alive: a block goes back the way it came.
extern KvCMemController* pKVMemory;

namespace ssaopt {

void* moduleAllocate(std::size_t size);
void moduleFree(void* block) noexcept;

// Standard allocator that follows the module allocation rule.
template <class T>
struct ModuleAllocator {
  using value_type = T;

  ModuleAllocator() noexcept = default;
  template <class U>
  ModuleAllocator(const ModuleAllocator<U>&) noexcept {}

  T* allocate(std::size_t n) { return static_cast<T*>(moduleAllocate(n * sizeof(T))); }
  void deallocate(T* p, std::size_t) noexcept { moduleFree(p); }

  template <class U>
  bool operator==(const ModuleAllocator<U>&) const noexcept { return true; }
  template <class U>
  bool operator!=(const ModuleAllocator<U>&) const noexcept { return false; }
};

}  // namespace ssaopt

// Gives a class (and every class derived from it) operator new/delete that follow the module
// allocation rule. Put it in the public section of each root class of the library.
#define SSAOPT_MODULE_ALLOCATED                                                            \
  static void* operator new(std::size_t size) { return ::ssaopt::moduleAllocate(size); }   \
  static void operator delete(void* block) noexcept { ::ssaopt::moduleFree(block); }       \
  static void* operator new[](std::size_t size) { return ::ssaopt::moduleAllocate(size); } \
  static void operator delete[](void* block) noexcept { ::ssaopt::moduleFree(block); }

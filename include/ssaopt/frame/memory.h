// The module's allocation rule. Every object and container of the library obtains its memory from the
// host's memory controller when one is installed (pKVMemory non-null). Otherwise it comes from a pool
// of the module's own: the pool of the session that KvCSSAControl::boot() opened, released with
// everything in it by shutdown(), or, outside a session, a pool that lasts until the program ends.
// The pointer is read anew at every allocation and deallocation.
//
// Blocks of the module's pools and of PoolMemController name the pool that handed them out, so they
// go back there whatever is installed when they are freed. A host controller of another kind knows
// its blocks only itself: it stays installed from before the first library object until after the
// last (see the README).
//
// Nothing global is replaced: the rule is carried by class-level operator new/delete on the library's
// root classes (SSAOPT_MODULE_ALLOCATED) and by ModuleAllocator in every container, so the host's own
// objects keep the host's allocator whatever pKVMemory says.
#pragma once

#include <cstddef>
#include <new>
#include <vector>

// The host's memory controller interface.
class KvCMemController {
public:
  virtual ~KvCMemController() = default;
  // Returns a block of at least `size` bytes.
  virtual void* allocMemBlock(unsigned long size) = 0;
  // Releases a block that allocMemBlock handed out.
  virtual void freeMemBlock(void* block) = 0;
};

// The host's global memory controller, or null for the module's own pools.
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
  bool operator==(const ModuleAllocator<U>&) const noexcept {
    return true;
  }
  template <class U>
  bool operator!=(const ModuleAllocator<U>&) const noexcept {
    return false;
  }
};

namespace detail {
class PoolArena;
// The pool that served the latest module allocation, or null when a host controller of another kind
// served it.
extern PoolArena* g_pLatestArena;
}  // namespace detail

// Keeps the pools that served a graph's nodes and edges from releasing their memory while the graph
// lives. A pool that ends before such a graph (its PoolMemController destroyed, or the module shut
// down) is reported and keeps its memory until the graph is gone, so destroying the graph afterwards
// is still safe. A graph calls holdLatest() right after allocating a node or an edge.
class PoolHold {
public:
  PoolHold() = default;
  PoolHold(const PoolHold&) = delete;
  PoolHold& operator=(const PoolHold&) = delete;
  ~PoolHold();

  void holdLatest() {
    if (detail::g_pLatestArena != m_pRecent) hold(detail::g_pLatestArena);
  }

private:
  void hold(detail::PoolArena* arena);

  detail::PoolArena* m_pRecent = nullptr;
  std::vector<detail::PoolArena*, ModuleAllocator<detail::PoolArena*>> m_Arenas;
};

}  // namespace ssaopt

// Gives a class (and every class derived from it) operator new/delete that follow the module
// allocation rule. Put it in the public section of each root class of the library.
#define SSAOPT_MODULE_ALLOCATED                                                            \
  static void* operator new(std::size_t size) { return ::ssaopt::moduleAllocate(size); }   \
  static void operator delete(void* block) noexcept { ::ssaopt::moduleFree(block); }       \
  static void* operator new[](std::size_t size) { return ::ssaopt::moduleAllocate(size); } \
  static void operator delete[](void* block) noexcept { ::ssaopt::moduleFree(block); }

// The module allocation rule and the pool controller.
#include <gtest/gtest.h>

#include <cstdlib>
#include <memory>

#include "ssaopt/frame/containers.h"
#include "ssaopt/frame/control.h"
#include "ssaopt/frame/graph.h"
#include "ssaopt/frame/pool.h"

using namespace ssaopt;

namespace {

class CountingController : public KvCMemController {
public:
  void* allocMemBlock(unsigned long size) override {
    ++allocations;
    return std::malloc(size);
  }
  void freeMemBlock(void* block) override {
    ++frees;
    std::free(block);
  }
  int allocations = 0;
  int frees = 0;
};

// Builds a few library objects and containers, then lets them go.
void exerciseLibrary() {
  graph G;
  node a = G.new_node(), b = G.new_node();
  G.new_edge(a, b);
  set<node> nodes{a, b};
  list<int> numbers{1, 2, 3};
  map<int, int> squares;
  squares[3] = 9;
  BxCXString name = BxCXString("#block_") + BxCXString(12ul, false, true);
  std::unique_ptr<KvCSSAControl> control(new KvCSSAControl);
  control->boot();
}

}  // namespace

TEST(AllocationRule, EveryLibraryAllocationGoesThroughAnInstalledController) {
  CountingController counting;
  {
    PoolMemController::Scope scope(&counting);
    exerciseLibrary();
  }
  EXPECT_GT(counting.allocations, 5);
  EXPECT_EQ(counting.allocations, counting.frees);
}

TEST(AllocationRule, WithoutControllerNothingCallsOne) {
  CountingController counting;
  ASSERT_EQ(pKVMemory, nullptr);
  exerciseLibrary();
  EXPECT_EQ(counting.allocations, 0);
  // The host's own objects never go through the controller, installed or not.
  PoolMemController::Scope scope(&counting);
  std::unique_ptr<int> hostObject(new int(4));
  std::string hostString(100, 'x');
  EXPECT_EQ(counting.allocations, 0);
}

TEST(PoolController, AccountsBlocksBytesAndPeak) {
  PoolMemController pool;
  void* small = pool.allocMemBlock(24);
  void* other = pool.allocMemBlock(24);
  void* large = pool.allocMemBlock(100000);
  EXPECT_EQ(pool.blocksInUse(), 3u);
  EXPECT_EQ(pool.bytesInUse(), 100048u);
  EXPECT_EQ(reinterpret_cast<std::uintptr_t>(small) % 16, 0u);
  EXPECT_EQ(reinterpret_cast<std::uintptr_t>(large) % 16, 0u);
  pool.freeMemBlock(large);
  pool.freeMemBlock(small);
  EXPECT_EQ(pool.blocksInUse(), 1u);
  EXPECT_EQ(pool.bytesInUse(), 24u);
  EXPECT_EQ(pool.peakBytes(), 100048u);
  // A freed block of the same size class is reused.
  EXPECT_EQ(pool.allocMemBlock(20), small);
  (void)other;
}

TEST(PoolController, ReleasesEverythingWhenDestroyed) {
  // Nothing here is freed by hand; LeakSanitizer in the sanitizer build checks the pool's destructor.
  PoolMemController pool;
  {
    PoolMemController::Scope scope(&pool);
    auto* G = new graph;
    for (int i = 0; i < 10000; ++i) G->new_node();
    for (node v : G->nodes()) G->new_edge(v, v);
  }
  EXPECT_GT(pool.blocksInUse(), 10000u);
  EXPECT_GT(pool.bytesReserved(), pool.bytesInUse());
}

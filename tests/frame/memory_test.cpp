// The module allocation rule, the pools, and memory with and without a controller of the host's:
// what the library makes and no one deletes is released with its pool, blocks go back to the pool
// that handed them out, and graphs that outlive their pool are reported instead of crashing.
// LeakSanitizer (the sanitizer build) checks every test here for leaks.
#include <gtest/gtest.h>

#include <cstdlib>
#include <cstring>
#include <memory>

#include "ssaopt/cfg/control_flow_graph.h"
#include "ssaopt/frame/containers.h"
#include "ssaopt/frame/control.h"
#include "ssaopt/frame/graph.h"
#include "ssaopt/frame/pool.h"
#include "ssaopt/frame/report.h"
#include "ssaopt/ir/edge_info.h"
#include "ssaopt/ir/node_info.h"

#if defined(__SANITIZE_ADDRESS__)
#define SSAOPT_ADDRESS_SANITIZER 1
#elif defined(__has_feature)
#if __has_feature(address_sanitizer)
#define SSAOPT_ADDRESS_SANITIZER 1
#endif
#endif

using namespace ssaopt;

namespace {

// A host controller that counts its calls. Each block has a zeroed prefix of its own, so that the
// library may look in front of a block it is wrongly given without leaving the host's memory.
class CountingController : public KvCMemController {
public:
  static constexpr std::size_t kPrefix = 16;
  void* allocMemBlock(unsigned long size) override {
    ++allocations;
    char* raw = static_cast<char*>(std::calloc(1, kPrefix + size));
    return raw + kPrefix;
  }
  void freeMemBlock(void* block) override {
    ++frees;
    std::free(static_cast<char*>(block) - kPrefix);
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
  std::unique_ptr<KvCControlFlowGraph> cfg(new KvCControlFlowGraph);
}

// "#main" with an entry, two blocks and an exit, as a front end builds it. The payloads, the
// procedure record and the exit node are the library's to leave behind: the graph deletes none.
void buildMain(KvCControlFlowGraph& G) {
  KvCCfgProcedure* pMain = nullptr;
  node entry = G.demandProcedureEntryNode("#main", pMain);
  node first = G.new_node(new KvCBasicBlock());
  node second = G.new_node(new KvCBasicBlock());
  G.getBasicBlock(first)->setProcedure(pMain);
  G.getBasicBlock(second)->setProcedure(pMain);
  G.new_edge(entry, first, new KvCCfgEdgeInfo());
  G.new_edge(first, second, new KvCCfgEdgeInfo());
  G.placeExitNodes();
}

// Reports of a pool ending while a graph holds its memory.
constexpr int kGraphOutlivesPool = 1;
constexpr int kForeignBlock = 2;
constexpr int kDestroyedWhileInstalled = 3;
const char* const kGraphOutlivesPoolText = "no graph holds blocks of a memory pool that ends";

// What all pools hold, once pools kept for graphs that have gone since are released (making a pool
// releases them).
std::size_t reservedAfterSweep() {
  PoolMemController sweep;
  return poolBytesReserved();
}

class InternalInfo {
public:
  explicit InternalInfo(bool on) : m_Previous(ShowInternalInfo()) { setShowInternalInfo(on); }
  ~InternalInfo() { setShowInternalInfo(m_Previous); }

private:
  bool m_Previous;
};

}  // namespace

TEST(AllocationRule, EveryLibraryAllocationGoesThroughAnInstalledController) {
  CountingController counting;
  {
    PoolMemController::Scope scope(&counting);
    exerciseLibrary();
    KvCSSAControl control;
    control.boot();
    control.shutdown();
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
#ifndef SSAOPT_ADDRESS_SANITIZER  // there every block is a heap block of its own
  // A freed block of the same size class is reused.
  EXPECT_EQ(pool.allocMemBlock(20), small);
#endif
  (void)other;
}

TEST(PoolController, ReleasesWhatTheLibraryLeavesBehindWhenDestroyed) {
  std::size_t before = reservedAfterSweep();
  {
    PoolMemController pool;
    PoolMemController::Scope scope(&pool);
    for (int i = 0; i < 10000; ++i) new KvCBasicBlock();
    EXPECT_GE(pool.blocksInUse(), 10000u);
    EXPECT_GT(poolBytesReserved(), before);
  }
  EXPECT_EQ(poolBytesReserved(), before);
}

TEST(ModuleSession, WithoutAHostControllerShutdownReleasesWhatNoOneDeletes) {
  std::size_t before = reservedAfterSweep();
  KvCSSAControl control;
  ASSERT_TRUE(control.boot());
  {
    KvCControlFlowGraph G;
    buildMain(G);
  }
  EXPECT_GT(poolBytesReserved(), before);
  ASSERT_TRUE(control.shutdown());
  EXPECT_EQ(poolBytesReserved(), before);
  EXPECT_TRUE(control.shutdown());  // again: nothing more to do
}

TEST(ModuleSession, DestroyingABootedControlShutsItDown) {
  std::size_t before = reservedAfterSweep();
  {
    KvCSSAControl control;
    control.boot();
    new KvCBasicBlock();
    KvCSSAControl copy(control);  // not booted: ends nothing when it goes
  }
  EXPECT_EQ(poolBytesReserved(), before);
}

TEST(ModuleSession, WithAHostControllerBootAndShutdownLeaveMemoryToIt) {
  std::size_t before = reservedAfterSweep();
  CountingController counting;
  PoolMemController::Scope scope(&counting);
  KvCSSAControl control;
  control.boot();
  KvCBasicBlock* pBlock = new KvCBasicBlock();
  EXPECT_EQ(counting.allocations, 1);
  control.shutdown();
  EXPECT_EQ(poolBytesReserved(), before);
  delete pBlock;
  EXPECT_EQ(counting.frees, 1);
}

TEST(ModuleSession, ObjectsMadeOutsideTheSessionMayBeDeletedInsideAndTheOtherWayRound) {
  ReportLog log;
  // A client variable, expression or statement of its own is deleted by the client, whenever that is.
  std::unique_ptr<KvCBasicBlock> madeBefore(new KvCBasicBlock());
  KvCSSAControl control;
  control.boot();
  madeBefore.reset();
  std::unique_ptr<KvCBasicBlock> madeInside(new KvCBasicBlock());
  {
    PoolMemController pool;
    PoolMemController::Scope scope(&pool);
    madeInside.reset();
    EXPECT_EQ(pool.blocksInUse(), 0u);
  }
  control.shutdown();
  EXPECT_TRUE(log.empty());
}

TEST(PoolController, ABlockGoesBackToThePoolThatHandedItOut) {
  ReportLog log;
  PoolMemController first, second;
  KvCBasicBlock* pBlock;
  {
    PoolMemController::Scope scope(&first);
    pBlock = new KvCBasicBlock();
  }
  {
    PoolMemController::Scope scope(&second);
    EXPECT_EQ(first.blocksInUse(), 1u);
    delete pBlock;
    EXPECT_EQ(first.blocksInUse(), 0u);
    EXPECT_EQ(second.blocksInUse(), 0u);
  }
  {
    PoolMemController::Scope scope(&first);
    pBlock = new KvCBasicBlock();
  }
  delete pBlock;  // with no controller installed, the same holds
  EXPECT_EQ(first.blocksInUse(), 0u);
  EXPECT_TRUE(log.empty());
}

// A graph destroyed after the pool it was built in has ended: the pool is reported and keeps its
// memory until the graph goes, and destroying the graph is safe.
class GraphOutlivingItsPool : public ::testing::TestWithParam<bool> {
protected:
  void expectReported(const ReportLog& log) {
    EXPECT_TRUE(log.hasInternalError("PoolMemController", kGraphOutlivesPool));
    EXPECT_EQ(log.hasConsistencyFailure(kGraphOutlivesPoolText), GetParam());
  }
  InternalInfo m_Info{GetParam()};
};

TEST_P(GraphOutlivingItsPool, ThePoolControllerOfTheHost) {
  ReportLog log;
  std::size_t before = reservedAfterSweep();
  std::unique_ptr<KvCControlFlowGraph> G;
  {
    PoolMemController pool;
    PoolMemController::Scope scope(&pool);
    G.reset(new KvCControlFlowGraph);
    buildMain(*G);
  }
  expectReported(log);
  EXPECT_GT(poolBytesReserved(), before);
  EXPECT_EQ(G->number_of_nodes(), 4);
  G.reset();
  EXPECT_EQ(reservedAfterSweep(), before);
  EXPECT_EQ(log.count(), GetParam() ? 2u : 1u);
}

TEST_P(GraphOutlivingItsPool, TheModulesOwnPool) {
  ReportLog log;
  KvCControlFlowGraph G;
  {
    KvCSSAControl control;
    control.boot();
    buildMain(G);
    std::size_t built = poolBytesReserved();
    control.shutdown();
    EXPECT_EQ(poolBytesReserved(), built);
  }
  expectReported(log);
  G.clear();
  G.del_node(G.new_node());  // a graph that outlived its pool goes on working from the default pool
}

INSTANTIATE_TEST_SUITE_P(InternalInformation, GraphOutlivingItsPool, ::testing::Bool(),
                         [](const ::testing::TestParamInfo<bool>& param) {
                           return param.param ? "On" : "Off";
                         });

TEST(PoolController, ABlockThatNoPoolHandedOutIsReportedAndLeftAlone) {
  ReportLog log;
  CountingController counting;
  void* block;
  {
    PoolMemController::Scope scope(&counting);
    block = moduleAllocate(32);
  }
  moduleFree(block);  // no controller installed: the block is not the module pools' to free
  EXPECT_TRUE(log.hasInternalError("PoolMemController", kForeignBlock));
  EXPECT_EQ(counting.frees, 0);
  counting.freeMemBlock(block);
}

TEST(PoolController, ASmallBlockFreedTwiceIsReported) {
#ifdef SSAOPT_ADDRESS_SANITIZER
  GTEST_SKIP() << "AddressSanitizer reports double frees itself";
#endif
  ReportLog log;
  PoolMemController pool;
  void* block = pool.allocMemBlock(40);
  pool.freeMemBlock(block);
  pool.freeMemBlock(block);
  EXPECT_TRUE(log.hasInternalError("PoolMemController", kForeignBlock));
  EXPECT_EQ(pool.blocksInUse(), 0u);
  EXPECT_NE(pool.allocMemBlock(40), pool.allocMemBlock(40));
}

TEST(PoolController, APoolDestroyedWhileInstalledIsUninstalled) {
  ReportLog log;
  auto* pPool = new PoolMemController;
  pKVMemory = pPool;
  delete pPool;
  EXPECT_TRUE(log.hasInternalError("PoolMemController", kDestroyedWhileInstalled));
  EXPECT_EQ(pKVMemory, nullptr);
}

// A program outside the project that uses the installed library through its umbrella header: it boots
// the module, computes on lattice values and lets the graph make procedure records and entry nodes,
// which the library leaves to the memory they came from.
//
// `consumer own-controller` installs a memory controller of the host's own kind, which must then free
// what the library leaves to it; without it the module's own pool serves, from boot() to shutdown().
// Either way nothing may leak (the install check runs both under valgrind).
#include <ssaopt/ssaopt.h>

#include <cstdlib>
#include <cstring>
#include <memory>
#include <new>
#include <unordered_set>

namespace {

// Blocks from the C heap, each remembered until it is freed; the rest goes when the controller does.
class HostMemory : public KvCMemController {
public:
  ~HostMemory() override {
    for (void* pBlock : m_Blocks) std::free(pBlock);
  }
  void* allocMemBlock(unsigned long size) override {
    void* pBlock = std::malloc(size ? size : 1);
    if (!pBlock) throw std::bad_alloc();
    m_Blocks.insert(pBlock);
    return pBlock;
  }
  void freeMemBlock(void* pBlock) override {
    m_Blocks.erase(pBlock);
    std::free(pBlock);
  }

private:
  std::unordered_set<void*> m_Blocks;
};

bool computeAndBuild() {
  KvCCfgValue a(6.0), b(7.0);
  KvCCfgValue product = a * b;
  KvCControlFlowGraph graph;
  KvCCfgProcedure* pMain = nullptr;
  ssaopt::node entry = graph.demandProcedureEntryNode(KvCControlFlowGraph::kMainProcedureName, pMain);
  return product.isConstant() && product.getValue() == 42.0 && pMain && pMain->getEntryNode() == entry &&
         graph.findProcedure("#main") == pMain;
}

}  // namespace

int main(int argc, char** argv) {
  // The host's controller is installed before the first library object and stays until the last is gone.
  std::unique_ptr<HostMemory> pMemory;
  if (argc > 1 && std::strcmp(argv[1], "own-controller") == 0) pMemory.reset(new HostMemory);
  pKVMemory = pMemory.get();
  KvCSSAControl control;
  control.boot();
  bool ok = computeAndBuild();
  control.shutdown();
  pKVMemory = nullptr;
  return ok ? 0 : 1;
}

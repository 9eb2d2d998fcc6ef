// Host services: reports, the internal-information switch, strings, module control and the
// insertion-ordered map.
#include <gtest/gtest.h>

#include "ssaopt/frame/containers.h"
#include "ssaopt/frame/control.h"
#include "ssaopt/frame/report.h"
#include "ssaopt/frame/types.h"

using namespace ssaopt;

TEST(Reports, InternalErrorReadsAsHostMessageSeven) {
  ReportLog log;
  reportInternalError("KvCPhiFunction", 93);
  ASSERT_EQ(log.messages().size(), 1u);
  EXPECT_EQ(log.messages()[0], "Internal error. Error code: KvCPhiFunction93.");
  EXPECT_TRUE(log.hasInternalError("KvCPhiFunction", 93));
  EXPECT_FALSE(log.hasInternalError("KvCPhiFunction", 94));
}

TEST(Reports, ConsistencyConditionsAreCheckedOnlyWhileTheSwitchIsOn) {
  ReportLog log;
  int evaluated = 0;
  auto failing = [&] {
    ++evaluated;
    return false;
  };
  setShowInternalInfo(false);
  KV_CONSISTENCY_CHECK(failing(), "m_Uses.member(v)", "KvCCfgVariable", 120);
  EXPECT_TRUE(log.empty());
  EXPECT_EQ(evaluated, 0);
  setShowInternalInfo(true);
  KV_CONSISTENCY_CHECK(failing(), "m_Uses.member(v)", "KvCCfgVariable", 120);
  KV_CONSISTENCY_CHECK(true, "never", "KvCCfgVariable", 121);
  setShowInternalInfo(false);
  ASSERT_EQ(log.consistencyFailures().size(), 1u);
  EXPECT_EQ(log.consistencyFailures()[0].file, "KvCCfgVariable");
  EXPECT_EQ(log.consistencyFailures()[0].line, 120);
  EXPECT_TRUE(log.hasConsistencyFailure("m_Uses.member(v)"));
}

TEST(Reports, LogsNestAndRestoreThePreviousSink) {
  ReportLog outer;
  {
    ReportLog inner;
    reportInternalError("A", 1);
    EXPECT_EQ(inner.count(), 1u);
  }
  reportInternalError("B", 2);
  EXPECT_EQ(outer.count(), 1u);
  EXPECT_TRUE(outer.hasInternalError("B", 2));
}

TEST(HostString, NumbersConcatenationAndComparison) {
  BxCXString name = BxCXString("#block_") + BxCXString(42ul, false, true);
  EXPECT_STREQ(name.cstring(), "#block_42");
  EXPECT_STRNE(BxCXString(10ul, false, true).cstring(), BxCXString(1ul, false, true).cstring());
  EXPECT_LT(compare(BxCXString("#block_7"), BxCXString("#main")), 0);
  EXPECT_EQ(compare(name, BxCXString("#block_42")), 0);
  EXPECT_GT(compare(BxCXString("b"), BxCXString("a")), 0);
}

TEST(ModuleControl, BootAndShutdownAlwaysSucceedAndLeaveCountersAlone) {
  std::uint32_t counter = 0;
  EXPECT_EQ(drawIndex(counter), 0u);
  EXPECT_EQ(drawIndex(counter), 1u);
  KvCSSAControl control;
  EXPECT_TRUE(control.boot());
  EXPECT_EQ(counter, 2u);
  KvCSSAControl copy(control);
  copy = control;
  BxCXString message("done");
  copy.stopTimeAndEmitMessage(message);
  EXPECT_TRUE(control.shutdown());
  std::uint32_t wrapping = 0xffffffffu;
  EXPECT_EQ(drawIndex(wrapping), 0xffffffffu);
  EXPECT_EQ(wrapping, 0u);
}

TEST(Containers, MapIteratesInInsertionOrderAndCreatesOnAccess) {
  map<const void*, int> m;
  int a, b, c;
  m[&c] = 3;
  m[&a] = 1;
  EXPECT_EQ(m[&b], 0);  // access creates the default entry
  m.undefine(&c);
  m[&c] = 4;
  std::vector<int> order;
  for (const auto& entry : m) order.push_back(entry.second);
  EXPECT_EQ(order, (std::vector<int>{1, 0, 4}));
  EXPECT_TRUE(m.defined(&b));
  EXPECT_EQ(m.lookup(static_cast<const void*>(&order)), nullptr);
  map<const void*, int> copy(m);
  copy[&a] = 10;
  EXPECT_EQ(m[&a], 1);
  EXPECT_EQ(*copy.lookup(&a), 10);
  EXPECT_EQ(copy.size(), 3u);
}

// Statements of the library: phi operands that are out of range or unset are reported, and a clone
// of a phi function starts without operands. A value expression takes no bare number.
#include <type_traits>

#include "doubles.h"

using irtest::TestVariable;
using irtest::Variables;
using Operands = std::vector<KvCCfgVariable*>;

static_assert(!std::is_constructible_v<KvCCfgValueExpression, double>,
              "a bare number must not silently become the non-constant mark");

class PhiOperands : public ::testing::Test {
protected:
  PhiOperands() {
    for (int i = 0; i < 3; ++i) phi.setReplacementVariable(i, abc[i]);
  }
  static Operands operandsOf(const KvCPhiFunction& phi) {
    return irtest::items(phi.getReplacementVariables());
  }

  TestVariable v, a, b, c;
  KvCCfgVariable* abc[3] = {&a, &b, &c};
  KvCPhiFunction phi{&v, 3};
};

TEST_F(PhiOperands, AnIndexOutsideTheOperandsIsReportedAndWritesNothing) {
  ssaopt::ReportLog log;
  phi.delReplacement(3);
  EXPECT_TRUE(log.hasInternalError("KvCPhiFunction", 93));  // reported even without internal info
  EXPECT_EQ(log.count(), 1u);
  irtest::InternalInfoOn on;
  phi.delReplacement(-1);
  phi.setReplacementVariable(3, &v);
  EXPECT_TRUE(log.hasConsistencyFailure("0"));
  EXPECT_TRUE(log.hasConsistencyFailure("0 <= i && i < Dim"));
  EXPECT_EQ(operandsOf(phi), (Operands{&a, &b, &c}));
}

TEST_F(PhiOperands, ACloneHasNoOperandsAndUnsetOperandsAreReportedAndLeftOut) {
  KvCPhiFunction* pCopy = phi.clone();
  EXPECT_EQ(pCopy->getVariable(), &v);
  EXPECT_GT(pCopy->getIndex(), phi.getIndex());
  EXPECT_EQ(operandsOf(*pCopy), (Operands{nullptr, nullptr, nullptr}));
  pCopy->setReplacementVariable(1, &b);
  ssaopt::ReportLog log;
  irtest::InternalInfoOn on;
  EXPECT_EQ(pCopy->getUsedVariables(), Variables{&b});
  EXPECT_TRUE(log.hasConsistencyFailure("pVariable"));
  delete pCopy;
}

// Basic blocks: deleting, splitting and cloning.
#include "doubles.h"
#include "ssaopt/ir/procedure.h"

using irtest::Fate;
using irtest::TestExpression;
using irtest::TestStatement;
using irtest::TestVariable;
using irtest::Variables;
using Statements = std::vector<KvCCfgStatement*>;

// Statements s[0..4] behind one phi function, ending in a condition.
class FiveStatementBlock : public ::testing::Test {
protected:
  FiveStatementBlock() {
    for (KvCCfgStatement*& pStatement : s) block.append(pStatement = new TestStatement());
    block.append(phi);
    block.appendBranch(&cond);
    block.setProcedure(&procedure);
  }
  ~FiveStatementBlock() override { irtest::deleteContents(block); }
  Statements statementsOf(const KvCBasicBlock& b) const { return irtest::items(b.getStatementSeq()); }

  TestVariable x;
  TestExpression cond;
  KvCCfgProcedure procedure;
  KvCBasicBlock block;
  KvCPhiFunction* phi = new KvCPhiFunction(&x, 2);
  KvCCfgStatement* s[5];
};

TEST_F(FiveStatementBlock, SplittingAtTheFirstOrAtAForeignStatementChangesNothing) {
  ssaopt::ReportLog log;
  EXPECT_EQ(block.splitAtStatement(s[0]), &block);
  EXPECT_TRUE(log.empty());
  TestStatement foreign;
  EXPECT_EQ(block.splitAtStatement(&foreign), &block);
  EXPECT_TRUE(log.hasInternalError("KvCBasicBlock", 338));
  EXPECT_EQ(statementsOf(block).size(), 5u);
  EXPECT_EQ(block.getBranchCond(), &cond);
}

TEST_F(FiveStatementBlock, DeletingRemovesFromTheRightListAndReportsStrangers) {
  Fate fate;
  block.append(new TestStatement({}, {}, &fate));
  block.del(block.getStatementSeq().back());
  EXPECT_EQ(fate.removed, 1);
  EXPECT_EQ(fate.destroyed, 1);
  block.del(phi);
  EXPECT_TRUE(block.getPhiFunctions().empty());
  EXPECT_EQ(statementsOf(block).size(), 5u);

  ssaopt::ReportLog log;
  TestStatement stranger({}, {}, &fate);
  KvCPhiFunction strangePhi(&x, 1);
  irtest::InternalInfoOn on;
  block.del(&stranger);
  block.del(&strangePhi);
  ASSERT_EQ(log.consistencyFailures().size(), 2u);
  EXPECT_EQ(log.consistencyFailures()[0].line, 298);
  EXPECT_EQ(log.consistencyFailures()[1].line, 284);
  EXPECT_EQ(fate.removed, 1);
}

TEST(BlockClone, OnlyASingleStatementOrPhiFunctionThatClonesGivesABlock) {
  TestVariable x;
  TestExpression cond;
  KvCBasicBlock statementOnly, phiOnly, withCondition, libraryOnly, unclonable;
  statementOnly.append(new TestStatement({&x}));
  phiOnly.append(new KvCPhiFunction(&x, 2));
  withCondition.append(new TestStatement());
  withCondition.appendBranch(&cond);
  libraryOnly.append(new KvCCfgOutputStatement(&x));
  unclonable.append(new TestStatement({}, {}, nullptr, false));
  EXPECT_EQ(withCondition.clone(), nullptr);
  EXPECT_EQ(libraryOnly.clone(), nullptr);  // rather than a block holding a null statement
  EXPECT_EQ(unclonable.clone(), nullptr);

  KvCBasicBlock* pStatementCopy = statementOnly.clone();
  KvCBasicBlock* pPhiCopy = phiOnly.clone();
  ASSERT_NE(pStatementCopy->isStatement(), nullptr);
  EXPECT_NE(pStatementCopy->isStatement(), statementOnly.isStatement());
  EXPECT_EQ(pStatementCopy->isStatement()->getDefinedVariables(), Variables{&x});
  ASSERT_NE(pPhiCopy->isPhiFunction(), nullptr);
  EXPECT_EQ(pPhiCopy->isPhiFunction()->getDimension(), 2);
  for (KvCBasicBlock* pBlock :
       {&statementOnly, &phiOnly, &withCondition, &libraryOnly, &unclonable, pStatementCopy, pPhiCopy})
    irtest::deleteContents(*pBlock);
  delete pStatementCopy;
  delete pPhiCopy;
}

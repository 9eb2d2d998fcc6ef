// Expressions and statements of the library: value expressions, definitions and uses, phi operand
// removal and the parameter statement's combination of its arguments.
#include <type_traits>

#include "doubles.h"

using irtest::TestExpression;
using irtest::TestVariable;
using irtest::Variables;
using Operands = std::vector<KvCCfgVariable*>;

static_assert(!std::is_constructible_v<KvCCfgValueExpression, double>,
              "a bare number must not silently become the non-constant mark");

TEST(ValueExpression, ItsRangeIsItsValueUnlessMarkedNonConstant) {
  KvCCfgValueExpression seven(constant(7.0)), marked(constant(7.0), true);
  EXPECT_VALUE(seven.getMaximum(), constant(7.0));
  EXPECT_VALUE(marked.getMinimum(), nonConstant);
  EXPECT_VALUE(KvCCfgValueExpression().evaluate(), undetermined);
  seven.replaceConditionWithConstant(1.0);
  EXPECT_VALUE(seven.evaluate(), constant(7.0));
}

TEST(LibraryStatements, NullSidesAndMissingExpressionsDefineAndUseNothingAndNoneClones) {
  TestVariable x, y, z;
  KvCCfgInitAssignment assignment;
  KvCCfgValueReturnStatement valueReturn(&x);
  EXPECT_TRUE(assignment.getDefinedVariables().empty());
  EXPECT_TRUE(assignment.getUsedVariables().empty());
  EXPECT_FALSE(assignment.hasSideEffects());
  EXPECT_TRUE(valueReturn.getUsedVariables().empty());

  KvCCfgExternCall call(nullptr);
  call.appendUsedVariable(&z);
  call.replaceVariable(&x, &y);  // inserts y even though x was not used
  EXPECT_EQ(call.getUsedVariables(), (Variables{&y, &z}));
  KvCCfgProcedureCall procedureCall;
  KvCCfgParamStatement param(&x);
  KvCCfgOutputStatement output(&x);
  for (KvCCfgStatement* pStatement : std::initializer_list<KvCCfgStatement*>{&assignment, &valueReturn, &call,
                                                                             &procedureCall, &param, &output})
    EXPECT_EQ(pStatement->clone(), nullptr);
}

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

TEST_F(PhiOperands, RemovingOneAtTheFrontMiddleOrEndKeepsTheOthersInOrder) {
  KvCPhiFunction front(phi), middle(phi), end(phi);
  front.delReplacement(0);
  middle.delReplacement(1);
  end.delReplacement(2);
  EXPECT_EQ(operandsOf(front), (Operands{&b, &c}));
  EXPECT_EQ(operandsOf(middle), (Operands{&a, &c}));
  EXPECT_EQ(operandsOf(end), (Operands{&a, &b}));
}

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

TEST(ParamStatement, CombinesTheArgumentsOfEveryCallThatPassesOne) {
  TestVariable formal, x, y;
  KvCCfgProcedureCall call1, call2, call3;
  KvCCfgParamStatement param(&formal);
  EXPECT_VALUE(param.evaluate(), undetermined);  // no call yet: some lattice value, no crash
  EXPECT_VALUE(param.getMaximum(), undetermined);

  TestExpression three({&x}, constant(3.0), constant(1.0), constant(8.0));
  TestExpression alsoThree({&y}, constant(3.0), constant(-2.0), constant(5.0));
  param.setArgument(&call1, &three);
  param.setArgument(&call2, &alsoThree);
  param.setArgument(&call3, nullptr);
  EXPECT_VALUE(param.evaluate(), constant(3.0));
  EXPECT_VALUE(param.getMinimum(), constant(-2.0));
  EXPECT_VALUE(param.getMaximum(), constant(8.0));
  EXPECT_EQ(param.getUsedVariables(), (Variables{&x, &y}));

  TestExpression four({}, constant(4.0));
  param.setArgument(&call1, &four);  // replaces the first argument
  EXPECT_VALUE(param.evaluate(), nonConstant);
  KvCCfgProcedureCall absent;
  EXPECT_EQ(param.getArgument(&absent), nullptr);
  EXPECT_EQ(param.getArguments().size(), 3u);  // reading added no entry
}

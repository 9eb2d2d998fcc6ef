// Boots the module, computes on lattice values the way constant propagation does, and shows how the
// data types of the generated code bring a number into range.
#include <cstdio>

#include "ssaopt/ssaopt.h"

namespace {

const char* kindName(const KvCCfgValue& v) {
  switch (v.getValueKind()) {
    case eCfgUndetermined:
      return "undetermined";
    case eCfgConstant:
      return "constant";
    case eCfgNonConstant:
      return "non-constant";
  }
  return "?";
}

void show(const char* text, const KvCCfgValue& v) {
  if (v.isConstant())
    std::printf("  %-28s = %s %g\n", text, kindName(v), v.getValue());
  else
    std::printf("  %-28s = %s\n", text, kindName(v));
}

}  // namespace

int main() {
  ssaopt::PoolMemController pool;
  ssaopt::PoolMemController::Scope usePool(&pool);
  KvCSSAControl control;
  control.boot();

  KvCCfgValue seven(7.0), three(3.0), zero(0.0);
  KvCCfgValue unknown;                   // nothing known yet
  KvCCfgValue varying(eCfgNonConstant);  // known to vary

  std::printf("arithmetic over the lattice:\n");
  show("7 + 3", seven + three);
  show("7 / 0", seven / zero);
  show("-7 % 3", -seven % three);
  show("1 << 33", KvCCfgValue(1.0) << KvCCfgValue(33.0));
  show("0 * non-constant", zero * varying);
  show("undetermined + non-constant", unknown + varying);
  show("0 && undetermined", zero && unknown);

  std::printf("casts to the types of the generated code:\n");
  KvCCfgValue v(300.0);
  show("300 as int8", cast(KV_DataType::int8(), v));
  KvCCfgValue minusOne(-1.0);
  show("-1 as uint16", cast(KV_DataType::uint16(), minusOne));
  KvCCfgValue five(5.0);
  show("5 as bool", cast(KV_DataType::boolean(), five, true));

  std::printf("merging the operands of a phi function:\n");
  KvCCfgValue a(3.0), b(3.0), c(4.0);
  show("intersect(3, 3)", intersect({&a, &b}));
  show("intersect(3, 4)", intersect({&a, &c}));
  show("intersect(3, undetermined)", intersect({&a, &unknown}));

  control.shutdown();
  return 0;
}

// A program outside the project that uses the installed library through its umbrella header.
#include <ssaopt/ssaopt.h>

int main() {
  KvCSSAControl control;
  if (!control.boot()) return 1;
  KvCCfgValue a(6.0), b(7.0);
  KvCCfgValue product = a * b;
  bool ok = product.isConstant() && product.getValue() == 42.0;
  control.shutdown();
  return ok ? 0 : 1;
}

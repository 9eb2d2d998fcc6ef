// The order by address that containers of statements and procedures use.
#pragma once

#include <functional>

namespace ssaopt {
namespace ir {

// -1, 0 or +1 as `a` lies below, at or above `b`; a total order even across separate allocations.
inline int compareAddresses(const void* a, const void* b) {
  if (a == b) return 0;
  return std::less<const void*>()(a, b) ? -1 : 1;
}

}  // namespace ir
}  // namespace ssaopt

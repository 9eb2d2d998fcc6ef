#include "ssaopt/frame/control.h"

#include "pool_arena.h"

void KvCControl::stopTimeAndEmitMessage(BxCXString&) {}

KvCSSAControl::~KvCSSAControl() { ssaopt::detail::endSession(this); }

bool KvCSSAControl::boot() {
  ssaopt::detail::beginSession(this);
  return true;
}

bool KvCSSAControl::shutdown() {
  ssaopt::detail::endSession(this);
  return true;
}

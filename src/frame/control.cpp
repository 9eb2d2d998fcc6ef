#include "ssaopt/frame/control.h"

void KvCControl::stopTimeAndEmitMessage(BxCXString&) {}

// Edge payloads: the shared object counter of the four edge classes.
#include "ssaopt/ir/edge_info.h"

#include "ssaopt/frame/control.h"

std::uint32_t KvCCfgEdgeInfo::s_GlobIndexCnt = 0;

void KvCCfgEdgeInfo::boot() { s_GlobIndexCnt = 0; }

KvCCfgEdgeInfo::KvCCfgEdgeInfo() : m_Index(ssaopt::drawIndex(s_GlobIndexCnt)) {}

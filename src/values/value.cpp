#include "ssaopt/values/value.h"

#include "ssaopt/frame/types.h"

int KvCCfgValue::compare(const KvCCfgValue& other) const {
  if (m_Kind != other.m_Kind) return 1;
  if (m_Kind != eCfgConstant) return 0;
  return m_Value == other.m_Value ? 0 : 1;
}

KvCCfgValue* KvCCfgValue::clone() const { return new KvCCfgValue(*this); }

void KvCCfgValue::changeToRepresentedValue(const KV_Scaling* scaling) {
  if (scaling) m_Value = KvCScaleTool::findRepresentedValue(m_Value, scaling);
}

void KvCCfgValue::changeToRepresentedValueDontRound(const KV_Scaling* scaling) {
  if (scaling) m_Value = KvCScaleTool::findRepresentedValueDontRound(m_Value, scaling);
}

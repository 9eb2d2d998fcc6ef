// The lattice value of constant propagation: nothing known yet, a known constant, or known to vary.
// The same class carries the bounds of a variable's value range. Every number is a double, whatever
// the data type in the generated code; conversion to a data type (cast, arithmetic.h) and to a
// fixed-point scaling are explicit operations.
#pragma once

#include "ssaopt/frame/memory.h"

class KV_Scaling;

// The three levels of the lattice, from top to bottom.
enum tagKvECfgValueKind { eCfgUndetermined = 0, eCfgConstant = 1, eCfgNonConstant = 2 };
typedef enum tagKvECfgValueKind KvECfgValueKind;

static_assert(sizeof(KvECfgValueKind) == 4, "the value kind is a 32-bit enumeration");

// A lattice value, copied freely. Its number means something only while it is a constant; values of
// the other kinds keep whatever number was last stored (0.0 unless one was), and nothing reads it.
class KvCCfgValue {
public:
  SSAOPT_MODULE_ALLOCATED

  KvCCfgValue() = default;
  explicit KvCCfgValue(double value) : m_Kind(eCfgConstant), m_Value(value) {}
  explicit KvCCfgValue(KvECfgValueKind kind) : m_Kind(kind) {}
  KvCCfgValue(const KvCCfgValue& other) = default;
  KvCCfgValue& operator=(const KvCCfgValue& other) = default;
  ~KvCCfgValue() = default;

  void setValue(double value) { m_Value = value; }
  double getValue() const { return m_Value; }
  void setValueKind(KvECfgValueKind kind) { m_Kind = kind; }
  KvECfgValueKind getValueKind() const { return m_Kind; }

  bool isUndetermined() const { return m_Kind == eCfgUndetermined; }
  bool isConstant() const { return m_Kind == eCfgConstant; }
  bool isNonConstant() const { return m_Kind == eCfgNonConstant; }

  // An equality test, not an ordering: 0 when both values are the same lattice element (equal kinds,
  // and for constants equal numbers, +0.0 equal to -0.0), else 1. Constant propagation asks it whether
  // a new value differs from the one it recorded.
  int compare(const KvCCfgValue& other) const;

  // A copy on the heap, owned by the caller.
  KvCCfgValue* clone() const;

  // Replace the number by the value that its fixed-point representation under `scaling` stands for,
  // rounded to the nearest representable value, or truncated toward zero. A null scaling leaves the
  // number alone. The kind is neither read nor changed: callers apply these to constants.
  void changeToRepresentedValue(const KV_Scaling* scaling);
  void changeToRepresentedValueDontRound(const KV_Scaling* scaling);

private:
  KvECfgValueKind m_Kind = eCfgUndetermined;
  double m_Value = 0.0;
};

// Variables of the generated code. Clients derive their variables from KvCCfgVariable and answer the
// questions only they can (data type, scaling, saturation, initial value); renaming creates one
// KvCSSAVariable per definition, which asks its original variable those questions and carries its own
// value range. Constant propagation keeps each variable's current lattice value here, adjusted to what
// the variable can hold.
#pragma once

#include <cstdint>

#include "ssaopt/frame/containers.h"
#include "ssaopt/frame/graph.h"
#include "ssaopt/frame/memory.h"
#include "ssaopt/ir/forward.h"
#include "ssaopt/values/value.h"

class KV_DataType;
class KV_Scaling;

class KvCCfgVariable {
public:
  SSAOPT_MODULE_ALLOCATED

  KvCCfgVariable();
  // A copy would leave two owners of the current value; the library never copies a variable.
  KvCCfgVariable(const KvCCfgVariable&) = delete;
  KvCCfgVariable& operator=(const KvCCfgVariable&) = delete;

  // Virtual operations, in slot order.
  virtual ~KvCCfgVariable();
  // Only SSA variables keep a range: these do nothing, or give null, on other variables.
  virtual void setMinValueAndDestroyOld(KvCCfgValue& value);
  virtual void setMaxValueAndDestroyOld(KvCCfgValue& value);
  virtual KvCCfgValue* getMinValue() const;
  virtual KvCCfgValue* getMaxValue() const;
  virtual const KV_DataType* getDataType() const = 0;
  // Null for an unscaled variable.
  virtual const KV_Scaling* getScaling() const = 0;
  virtual bool isUpperBorderSaturated() const = 0;
  virtual bool isLowerBorderSaturated() const = 0;
  virtual double getUpperLimit() const = 0;
  virtual double getLowerLimit() const = 0;
  // Read only; the library neither keeps nor deletes it. The base gives an undetermined value.
  virtual const KvCCfgValue* getInitValue() const;
  virtual bool isOutput() const;
  virtual KvCCfgSFVariable* isSFVariable();
  virtual KvCSSAVariable* isSSAVariable();
  // Makes [minimum, maximum], bounds of values the variable already holds (a phi function's or a
  // value return's, merged from versions of the same variable), its range without fitting them
  // again. The base passes each bound to setMinValueAndDestroyOld and setMaxValueAndDestroyOld.
  virtual void setVarRange(const KvCCfgValue& minimum, const KvCCfgValue& maximum);

  std::uint32_t getIndex() const { return m_Index; }
  static void boot();

  // The current value, still owned by the variable.
  KvCCfgValue* getValue() const { return m_pValue; }
  // Adjusts `value` in place to what the variable holds once it is stored, storing nothing: the
  // saturated border, else the scaling's represented value, else the value cast to the data type
  // (a Boolean becomes 0 or 1); non-constant for an array or volatile variable.
  void adjustCfgValue(KvCCfgValue& value) const;
  // Adjusts `value` in place to what the variable can hold and stores a copy as the current value.
  // The value object replaced is not deleted: a caller that fetched it with getValue() owns it now.
  void setVarValueAndAdjustCfgValue(KvCCfgValue& value);
  // Makes `value`, a value that the variable already held (the meet of a phi function's operands),
  // the current value without adjusting it again: saturating and casting are not idempotent (an
  // unsigned variable saturated at 20 holds 4294967295 after storing -1, which a second adjustment
  // would clamp to 20). Array and volatile variables still become non-constant. The replaced value
  // object is the caller's, as with setVarValueAndAdjustCfgValue.
  void setVarValue(KvCCfgValue& value);
  // Brings [minimum, maximum], bounds of the values assigned to the variable, in place to the least
  // range of what the variable then holds: what saturation makes of the values beyond a saturated
  // border (the limit), and what the scaling or the data type makes of those within the borders
  // (castRange: an integer type wrapped inside the range gives the type's whole range). Fitting the
  // two bounds alone would claim too little wherever the type wraps between them. A bound that is
  // not a constant counts as open; an undetermined one stays undetermined, a non-constant one stays
  // non-constant unless the type bounds that side, and an infinite end that was not a constant
  // becomes non-constant again. Values that may be NaN have no number as a bound on either side
  // (both bounds open, or the constant NaN): a float or scaled variable keeps a stored NaN, which
  // saturation leaves alone and no range holds, so such a variable gets no bound then, while a range
  // bounded by a number on at least one side holds numbers only. With both bounds open it gives the
  // range every value of the variable (an element of an array) keeps.
  void fitRange(KvCCfgValue& minimum, KvCCfgValue& maximum) const;
  // Fits [minimum, maximum], bounds of the values assigned, in place (fitRange) and makes it the
  // variable's range (setVarRange).
  void setVarRangeAndAdjust(KvCCfgValue& minimum, KvCCfgValue& maximum);
  // Clamps the number of `value` (whatever its kind) to the saturated borders; true when it changed.
  bool ConsiderSaturation(KvCCfgValue& value) const;
  bool isScaled() const;

  // The SSA versions that stand for this variable while renaming walks the dominator tree.
  void pushSSAReplacement(KvCCfgVariable* pReplacement) { m_SSAReplacements.push(pReplacement); }
  // The stack must not be empty.
  KvCCfgVariable* popSSAReplacement() { return m_SSAReplacements.pop(); }
  // Null when the stack is empty.
  KvCCfgVariable* topSSAReplacement() const;

  KvCCfgVariable* getNonVirtualAlias() const { return m_pNonVirtualAlias; }
  void setNonVirtualAlias(KvCCfgVariable* pAlias) { m_pNonVirtualAlias = pAlias; }
  void appendVirtualAlias(KvCCfgVariable* pAlias) { m_VirtualAliases.insert(pAlias); }

  // Array and volatile variables are never constant: marking one drops its current value.
  bool isArray() const { return m_IsArray; }
  void markAsArray();
  bool isVolatile() const { return m_IsVolatile; }
  void markAsVolatile();
  bool isErasable() const { return m_IsErasable; }
  void markAsErasable() { m_IsErasable = true; }

  void appendUse(ssaopt::node v) { m_Uses.insert(v); }
  // Removes `v` from the uses and returns how many are left.
  int delUse(ssaopt::node v);
  ssaopt::set<ssaopt::node> getUses() const { return m_Uses; }
  int countUses() const { return static_cast<int>(m_Uses.size()); }
  void clearUses() { m_Uses.clear(); }
  // The uses of this variable and of its virtual aliases (one level).
  ssaopt::set<ssaopt::node> getAllUses() const;
  // countUses() plus that of every virtual alias: a node used by both counts twice.
  int countAllUses() const;

protected:
  bool isNeverConstant() const { return m_IsArray || m_IsVolatile; }
  // Brings a constant that saturation left alone to the variable's representation: the scaling's
  // represented value when scaled, else the data type's value set (a Boolean becomes 0 or 1).
  void fitConstant(KvCCfgValue& value) const;

private:
  void dropValueToNonConstant();
  // Whether storing NaN leaves NaN.
  bool storesNaN() const;
  // What saturation makes of a number beyond a saturated border.
  double saturated(double number) const;
  // Brings a range within the saturated borders to what storing its numbers gives.
  void convertRange(double& from, double& to) const;

  static std::uint32_t s_GlobIndexCnt;

  std::uint32_t m_Index;
  ssaopt::stack<KvCCfgVariable*> m_SSAReplacements;
  KvCCfgValue* m_pValue;
  ssaopt::set<ssaopt::node> m_Uses;
  bool m_IsArray = false;
  bool m_IsErasable = false;
  bool m_IsVolatile = false;
  KvCCfgVariable* m_pNonVirtualAlias;
  ssaopt::set<KvCCfgVariable*> m_VirtualAliases;
};

class KvCSSAVariable : public KvCCfgVariable {
public:
  // A new variable index; takes over the array, erasable and volatile marks of `var` and leads to
  // the original variable even when `var` is itself an SSA variable.
  explicit KvCSSAVariable(KvCCfgVariable* var);

  ~KvCSSAVariable() override;
  // Replace the bound by a copy of `value` adjusted to the variable as a single value would be;
  // `value` itself stays unchanged. A bound fitted alone holds only while the type does not wrap
  // between the two bounds: constant propagation fits both together (setVarRangeAndAdjust).
  void setMinValueAndDestroyOld(KvCCfgValue& value) override;
  void setMaxValueAndDestroyOld(KvCCfgValue& value) override;
  KvCCfgValue* getMinValue() const override { return m_pMinValue; }
  KvCCfgValue* getMaxValue() const override { return m_pMaxValue; }
  // The client's questions go to the original variable.
  const KV_DataType* getDataType() const override;
  const KV_Scaling* getScaling() const override;
  bool isUpperBorderSaturated() const override;
  bool isLowerBorderSaturated() const override;
  double getUpperLimit() const override;
  double getLowerLimit() const override;
  const KvCCfgValue* getInitValue() const override;
  KvCSSAVariable* isSSAVariable() override { return this; }
  // Replaces both bounds by copies of the given ones; an array or volatile variable gets none.
  void setVarRange(const KvCCfgValue& minimum, const KvCCfgValue& maximum) override;

  void setOrigVar(KvCCfgVariable* var);
  KvCCfgVariable* getOrigVar() const { return m_pOrigVar; }

private:
  void replaceBound(KvCCfgValue*& pBound, const KvCCfgValue& value);
  void storeBound(KvCCfgValue*& pBound, const KvCCfgValue& value);

  KvCCfgVariable* m_pOrigVar = nullptr;
  KvCCfgValue* m_pMinValue;
  KvCCfgValue* m_pMaxValue;
};

// The reference client's variable: a named variable of the generated C code with a data type, an
// optional fixed-point scaling, optional saturation of either border, an initial value, and the
// output, volatile, array and erasable marks. The library asks it what only a client knows; the
// array, volatile and erasable marks live in the library's own variable class.
#pragma once

#include <cstdint>
#include <optional>
#include <string>

#include "ssaopt/client/diagnostics.h"
#include "ssaopt/frame/types.h"
#include "ssaopt/ir/variable.h"

class KvCCfgSFVariable : public KvCCfgVariable {
public:
  // `declarationIndex` is the variable's place among the program's declarations; printing follows it.
  KvCCfgSFVariable(std::string name, const KV_DataType* pType, std::uint32_t declarationIndex,
                   ssaopt::client::SourcePos pos);

  const KV_DataType* getDataType() const override { return m_pType; }
  const KV_Scaling* getScaling() const override { return m_Scaling ? &*m_Scaling : nullptr; }
  bool isUpperBorderSaturated() const override { return m_UpperLimit.has_value(); }
  bool isLowerBorderSaturated() const override { return m_LowerLimit.has_value(); }
  double getUpperLimit() const override { return m_UpperLimit.value_or(0.0); }
  double getLowerLimit() const override { return m_LowerLimit.value_or(0.0); }
  // The declared initial value, or 0 as for a C variable of static storage.
  const KvCCfgValue* getInitValue() const override { return &m_InitValue; }
  bool isOutput() const override { return m_IsOutput; }
  KvCCfgSFVariable* isSFVariable() override { return this; }

  const std::string& getName() const { return m_Name; }
  std::uint32_t getDeclarationIndex() const { return m_DeclarationIndex; }
  ssaopt::client::SourcePos getPosition() const { return m_Pos; }

  void setScaling(double lsb, double offset) { m_Scaling.emplace(lsb, offset); }
  void saturateUpperBorder(double limit) { m_UpperLimit = limit; }
  void saturateLowerBorder(double limit) { m_LowerLimit = limit; }
  void setInitValue(double value);
  bool hasDeclaredInitValue() const { return m_HasDeclaredInitValue; }
  void markAsOutput() { m_IsOutput = true; }
  // Marks the variable as an array of `length` elements.
  void makeArray(std::uint32_t length);
  std::uint32_t getArrayLength() const { return m_ArrayLength; }

private:
  std::string m_Name;
  const KV_DataType* m_pType;
  std::uint32_t m_DeclarationIndex;
  ssaopt::client::SourcePos m_Pos;
  std::optional<KV_Scaling> m_Scaling;
  std::optional<double> m_UpperLimit;
  std::optional<double> m_LowerLimit;
  KvCCfgValue m_InitValue{0.0};
  bool m_HasDeclaredInitValue = false;
  bool m_IsOutput = false;
  std::uint32_t m_ArrayLength = 0;
};

namespace ssaopt::client {

// The variable that `pVariable` stands for: the original of an SSA version, else itself.
KvCCfgVariable* originalOf(KvCCfgVariable* pVariable);

// The bounds every value read from the variable keeps, whatever is assigned to it (fitRange of an
// open range): for an unscaled integer or Boolean variable the range of its data type, narrowed by
// saturation limits only where the values within them cannot wrap past them; for a scaled or float
// variable the saturation limits, or what the scaling rounds them to, where it is volatile (its reads
// are inputs, numbers) and none otherwise (a stored NaN stays NaN). Empty where there is none.
std::optional<double> declaredLowerBound(const KvCCfgVariable& variable);
std::optional<double> declaredUpperBound(const KvCCfgVariable& variable);

}  // namespace ssaopt::client

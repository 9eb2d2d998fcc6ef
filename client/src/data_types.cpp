#include "ssaopt/client/data_types.h"

#include <cfloat>
#include <cmath>
#include <cstring>

namespace ssaopt::client {

namespace {

struct NamedType {
  const char* name;
  const KV_DataType* (*type)();
  std::optional<double> minimum;
  std::optional<double> maximum;
};

const NamedType kTypes[] = {
    {"bool", &KV_DataType::boolean, 0.0, 1.0},
    {"int8", &KV_DataType::int8, -128.0, 127.0},
    {"uint8", &KV_DataType::uint8, 0.0, 255.0},
    {"int16", &KV_DataType::int16, -32768.0, 32767.0},
    {"uint16", &KV_DataType::uint16, 0.0, 65535.0},
    {"int32", &KV_DataType::int32, -2147483648.0, 2147483647.0},
    {"uint32", &KV_DataType::uint32, 0.0, 4294967295.0},
    {"float32", &KV_DataType::float32, std::nullopt, std::nullopt},
    {"float64", &KV_DataType::float64, std::nullopt, std::nullopt},
};

const NamedType* entryOf(const KV_DataType* pType) {
  for (const NamedType& entry : kTypes)
    if (entry.type() == pType) return &entry;
  return nullptr;
}

}  // namespace

const KV_DataType* dataTypeNamed(std::string_view name) {
  for (const NamedType& entry : kTypes)
    if (name == entry.name) return entry.type();
  return nullptr;
}

const char* nameOfDataType(const KV_DataType* pType) {
  const NamedType* pEntry = entryOf(pType);
  return pEntry ? pEntry->name : "?";
}

bool isIntegerType(const KV_DataType* pType) {
  const NamedType* pEntry = entryOf(pType);
  return pEntry && pEntry->minimum && !pType->isBool();
}

bool isFloatType(const KV_DataType* pType) {
  return pType == KV_DataType::float32() || pType == KV_DataType::float64();
}

std::optional<double> typeMinimum(const KV_DataType* pType) {
  const NamedType* pEntry = entryOf(pType);
  return pEntry ? pEntry->minimum : std::nullopt;
}

std::optional<double> typeMaximum(const KV_DataType* pType) {
  const NamedType* pEntry = entryOf(pType);
  return pEntry ? pEntry->maximum : std::nullopt;
}

bool typeHolds(const KV_DataType* pType, double value) {
  if (pType == KV_DataType::float64()) return true;
  if (pType == KV_DataType::float32()) return !std::isfinite(value) || std::fabs(value) <= FLT_MAX;
  std::optional<double> minimum = typeMinimum(pType), maximum = typeMaximum(pType);
  return minimum && maximum && value == std::trunc(value) && value >= *minimum && value <= *maximum;
}

}  // namespace ssaopt::client

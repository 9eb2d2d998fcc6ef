// The data types of the textual format by name, and what values each can hold.
#pragma once

#include <optional>
#include <string_view>

#include "ssaopt/frame/types.h"

namespace ssaopt::client {

// bool, int8, uint8, int16, uint16, int32, uint32, float32 or float64; null for any other name.
const KV_DataType* dataTypeNamed(std::string_view name);
// The name dataTypeNamed knows the type by.
const char* nameOfDataType(const KV_DataType* pType);

bool isIntegerType(const KV_DataType* pType);
bool isFloatType(const KV_DataType* pType);

// The least and greatest value of an integer or Boolean type; empty for the float types.
std::optional<double> typeMinimum(const KV_DataType* pType);
std::optional<double> typeMaximum(const KV_DataType* pType);

// Whether a variable of the type can be given `value`: a Boolean 0 or 1, an integer type an integer
// within its range, float32 a number within its range (rounded to single precision), float64 any.
bool typeHolds(const KV_DataType* pType, double value);

}  // namespace ssaopt::client

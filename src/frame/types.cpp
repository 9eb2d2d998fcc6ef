#include "ssaopt/frame/types.h"

#include <cmath>

namespace {

using Kind = KV_BaseType::Kind;

const KV_BaseType kBool(Kind::Bool), kInt8(Kind::Int8), kUInt8(Kind::UInt8), kInt16(Kind::Int16),
    kUInt16(Kind::UInt16), kInt32(Kind::Int32), kUInt32(Kind::UInt32), kFloat32(Kind::Float32),
    kFloat64(Kind::Float64);

const KV_DataType kBoolType(&kBool, true, "bool");
const KV_DataType kInt8Type(&kInt8, false, "int8_t");
const KV_DataType kUInt8Type(&kUInt8, false, "uint8_t");
const KV_DataType kInt16Type(&kInt16, false, "int16_t");
const KV_DataType kUInt16Type(&kUInt16, false, "uint16_t");
const KV_DataType kInt32Type(&kInt32, false, "int32_t");
const KV_DataType kUInt32Type(&kUInt32, false, "uint32_t");
const KV_DataType kFloat32Type(&kFloat32, false, "float");
const KV_DataType kFloat64Type(&kFloat64, false, "double");

template <class Round>
double represent(double value, const KV_Scaling* scaling, Round round) {
  if (!scaling || scaling->getLSB() == 0.0) return value;
  double steps = round((value - scaling->getOffset()) / scaling->getLSB());
  return steps * scaling->getLSB() + scaling->getOffset();
}

}  // namespace

const KV_DataType* KV_DataType::boolean() { return &kBoolType; }
const KV_DataType* KV_DataType::int8() { return &kInt8Type; }
const KV_DataType* KV_DataType::uint8() { return &kUInt8Type; }
const KV_DataType* KV_DataType::int16() { return &kInt16Type; }
const KV_DataType* KV_DataType::uint16() { return &kUInt16Type; }
const KV_DataType* KV_DataType::int32() { return &kInt32Type; }
const KV_DataType* KV_DataType::uint32() { return &kUInt32Type; }
const KV_DataType* KV_DataType::float32() { return &kFloat32Type; }
const KV_DataType* KV_DataType::float64() { return &kFloat64Type; }

double KvCScaleTool::findRepresentedValue(double value, const KV_Scaling* scaling) {
  return represent(value, scaling, [](double x) { return std::round(x); });
}

double KvCScaleTool::findRepresentedValueDontRound(double value, const KV_Scaling* scaling) {
  return represent(value, scaling, [](double x) { return std::trunc(x); });
}

// Host records of the generated code: data types and fixed-point scalings, and the scaling tool.
#pragma once

#include "ssaopt/frame/memory.h"

// The elementary type behind a data type of the generated code. A Boolean's base type passes none of
// the eight numeric tests.
class KV_BaseType {
public:
  SSAOPT_MODULE_ALLOCATED

  enum class Kind { Bool, Int8, UInt8, Int16, UInt16, Int32, UInt32, Float32, Float64 };

  explicit KV_BaseType(Kind kind) : m_Kind(kind) {}
  virtual ~KV_BaseType() = default;

  Kind getKind() const { return m_Kind; }
  virtual bool isFloat64() const { return m_Kind == Kind::Float64; }
  virtual bool isFloat32() const { return m_Kind == Kind::Float32; }
  virtual bool isInt32() const { return m_Kind == Kind::Int32; }
  virtual bool isInt16() const { return m_Kind == Kind::Int16; }
  virtual bool isInt8() const { return m_Kind == Kind::Int8; }
  virtual bool isUInt32() const { return m_Kind == Kind::UInt32; }
  virtual bool isUInt16() const { return m_Kind == Kind::UInt16; }
  virtual bool isUInt8() const { return m_Kind == Kind::UInt8; }

private:
  Kind m_Kind;
};

// A data type of the generated code. The library asks it only for its base type and whether it is a
// Boolean (isBool) or a logical type (isLogicalType: its variables hold only 0 and 1).
class KV_DataType {
public:
  SSAOPT_MODULE_ALLOCATED

  KV_DataType(const KV_BaseType* base, bool isBoolean, const char* name)
      : m_pBase(base), m_IsBool(isBoolean), m_Name(name) {}
  virtual ~KV_DataType() = default;

  virtual const KV_BaseType* getBaseType() const { return m_pBase; }
  virtual bool isBool() const { return m_IsBool; }
  virtual bool isLogicalType() const { return m_IsBool; }
  // The C name of the type ("int16_t"), for clients that print it.
  const char* getName() const { return m_Name; }

  // Ready-made elementary types; they live as long as the program.
  static const KV_DataType* boolean();
  static const KV_DataType* int8();
  static const KV_DataType* uint8();
  static const KV_DataType* int16();
  static const KV_DataType* uint16();
  static const KV_DataType* int32();
  static const KV_DataType* uint32();
  static const KV_DataType* float32();
  static const KV_DataType* float64();

private:
  const KV_BaseType* m_pBase;
  bool m_IsBool;
  const char* m_Name;
};

// A fixed-point scaling: the stored integer n stands for n * LSB + offset.
class KV_Scaling {
public:
  SSAOPT_MODULE_ALLOCATED

  KV_Scaling(double lsb, double offset) : m_LSB(lsb), m_Offset(offset) {}
  virtual ~KV_Scaling() = default;

  virtual double getLSB() const { return m_LSB; }
  virtual double getOffset() const { return m_Offset; }

private:
  double m_LSB;
  double m_Offset;
};

class KvCScaleTool {
public:
  // The value that the fixed-point representation of `value` stands for: the nearest representable
  // value, halves rounded away from zero. Without a scaling, or with an LSB of 0, `value` itself.
  static double findRepresentedValue(double value, const KV_Scaling* scaling);
  // The same, with the stored integer truncated toward zero instead of rounded.
  static double findRepresentedValueDontRound(double value, const KV_Scaling* scaling);
};

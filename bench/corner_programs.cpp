// Programs that each push one dimension to its limit: one expression of many terms, one phi function
// of many operands, loops nested many deep.
#include <sstream>
#include <string>

#include "program_shapes.h"

namespace ssaopt::bench {

namespace {

// a = x + x + ... + x, one term per statement of the size.
std::string makeFlatExpression(std::size_t terms) {
  std::ostringstream out;
  out << "var int16 x volatile;\nvar int32 a output = 0;\n\nproc #main {\n  a = x";
  for (std::size_t i = 1; i < terms; ++i) out << " + x";
  out << ";\n}\n";
  return out.str();
}

// One join with an in-edge from each of `operands` blocks, each assigning its own constant.
std::string makeWideJoin(std::size_t operands) {
  std::ostringstream out;
  out << "var uint16 k volatile;\nvar int32 a output = 0;\n\nproc #main {\n";
  for (std::size_t i = 0; i < operands; ++i) {
    if (i > 0) out << "c" << i << ":\n";
    out << "  if k == " << i << " goto a" << i << " else "
        << (i + 1 < operands ? "c" + std::to_string(i + 1) : "join") << ";\n";
    out << "a" << i << ":\n  a = " << i % 1000 << ";\n  goto join;\n";
  }
  out << "join:\n  a = a + 1;\n}\n";
  return out.str();
}

// `depth` loops, each inside the one before, each counting its own counter to 2.
std::string makeLoopNest(std::size_t depth) {
  std::ostringstream out;
  out << "var int32 a output = 0;\n";
  for (std::size_t i = 0; i < depth; ++i) out << "var uint8 k" << i << " = 0;\n";
  out << "\nproc #main {\n";
  for (std::size_t i = 0; i < depth; ++i) {
    out << "  k" << i << " = 0;\n";
    out << "h" << i << ":\n  if k" << i << " < 2 goto b" << i << " else e" << i << ";\n";
    out << "b" << i << ":\n";
  }
  out << "  a = a + 1;\n";
  for (std::size_t i = depth; i-- > 0;) {
    out << "  k" << i << " = k" << i << " + 1;\n  goto h" << i << ";\n";
    out << "e" << i << ":\n";
  }
  out << "}\n";
  return out.str();
}

}  // namespace

const char* cornerName(Corner corner) {
  switch (corner) {
    case Corner::FlatExpression:
      return "flat";
    case Corner::WideJoin:
      return "join";
    case Corner::LoopNest:
      return "nest";
  }
  return "";
}

std::optional<Corner> cornerNamed(const std::string& name) {
  for (Corner corner : kCorners)
    if (name == cornerName(corner)) return corner;
  return std::nullopt;
}

std::string makeCornerProgram(Corner corner, std::size_t size) {
  switch (corner) {
    case Corner::FlatExpression:
      return makeFlatExpression(size);
    case Corner::WideJoin:
      return makeWideJoin(size);
    case Corner::LoopNest:
      return makeLoopNest(size);
  }
  return "";
}

}  // namespace ssaopt::bench

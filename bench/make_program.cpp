// Writes one benchmark program to standard output, so that the tool can be profiled on it:
//   ssaopt_make_program STATEMENTS large|small|shared|chart > program.ssa
//   ssaopt_make_program SIZE flat|join|nest > program.ssa
#include <cstdlib>
#include <iostream>
#include <optional>
#include <string>

#include "program_shapes.h"

int main(int argc, char** argv) {
  std::string kind = argc == 3 ? argv[2] : "";
  std::size_t size = argc == 3 ? std::strtoull(argv[1], nullptr, 10) : 0;
  if (std::optional<ssaopt::bench::Shape> shape = ssaopt::bench::shapeNamed(kind)) {
    std::cout << ssaopt::bench::makeControllerProgram(size, *shape);
    return 0;
  }
  if (std::optional<ssaopt::bench::Corner> corner = ssaopt::bench::cornerNamed(kind)) {
    std::cout << ssaopt::bench::makeCornerProgram(*corner, size);
    return 0;
  }
  std::cerr << "usage: ssaopt_make_program SIZE large|small|shared|chart|flat|join|nest\n";
  return 2;
}

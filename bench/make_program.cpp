// Writes one benchmark program to standard output, so that the tool can be profiled on it:
//   ssaopt_make_program STATEMENTS large|small|shared|chart > program.ssa
#include <cstdlib>
#include <iostream>
#include <optional>
#include <string>

#include "program_shapes.h"

int main(int argc, char** argv) {
  std::optional<ssaopt::bench::Shape> shape = ssaopt::bench::shapeNamed(argc == 3 ? argv[2] : "");
  if (!shape) {
    std::cerr << "usage: ssaopt_make_program STATEMENTS large|small|shared|chart\n";
    return 2;
  }
  std::cout << ssaopt::bench::makeControllerProgram(std::strtoull(argv[1], nullptr, 10), *shape);
  return 0;
}

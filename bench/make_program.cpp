// Writes one benchmark program to standard output, so that the tool can be profiled on it:
//   ssaopt_make_program STATEMENTS large|small > program.ssa
#include <cstdlib>
#include <iostream>
#include <string>

#include "program_shapes.h"

int main(int argc, char** argv) {
  std::string shape = argc == 3 ? argv[2] : "";
  if (shape != "large" && shape != "small") {
    std::cerr << "usage: ssaopt_make_program STATEMENTS large|small\n";
    return 2;
  }
  std::cout << ssaopt::bench::makeControllerProgram(
      std::strtoull(argv[1], nullptr, 10), shape == "large" ? ssaopt::bench::Shape::FewLargeProcedures
                                                            : ssaopt::bench::Shape::ManySmallProcedures);
  return 0;
}

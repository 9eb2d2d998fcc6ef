// A program outside the project that uses the installed reference client the way a front end's tests
// would: it reads a program in the textual format, runs the typical pipeline of the library on it,
// checks that its behaviour is unchanged, prints it and emits it as C.
//
// `client_consumer own-controller` installs a pool controller of its own; without it the module's own
// pool serves, from boot() to shutdown(). Either way nothing may leak (the install check runs both
// under valgrind).
#include <ssaopt/client/c_emitter.h>
#include <ssaopt/client/front_end.h>
#include <ssaopt/client/interpreter.h>
#include <ssaopt/client/pipeline.h>
#include <ssaopt/client/printer.h>
#include <ssaopt/ssaopt.h>

#include <cstdio>
#include <cstring>
#include <memory>
#include <string>

namespace {

const char* const kProgram = R"(
var bool enabled erasable = 0;
var int16 speed scale(0.5) volatile;
var int16 limit scale(0.5) erasable = 0;
var int16 command scale(0.5) saturate(-100..100) output = 0;

proc #main {
  enabled = 1;
  if enabled goto on else off;
on:
  call limitCommand();
  goto end;
off:
  command = 0;
}

proc limitCommand {
  limit = 60;
  command = speed;
  if command > limit goto clamp else end;
clamp:
  command = limit;
}
)";

bool fail(const char* what) {
  std::fprintf(stderr, "client_consumer: %s\n", what);
  return false;
}

bool transformAndCheck() {
  std::unique_ptr<ssaopt::client::Program> original = ssaopt::client::loadProgram(kProgram).program;
  std::unique_ptr<ssaopt::client::Program> transformed = ssaopt::client::loadProgram(kProgram).program;
  if (!original || !transformed) return fail("the program does not load");
  if (!ssaopt::client::runTypicalRun(*transformed)) return fail("a step of the typical run was refused");
  if (!transformed->graph().verify()) return fail("the verifier found the graph broken");
  ssaopt::client::CheckReport report =
      ssaopt::client::checkBehaviour(*original, *transformed, ssaopt::client::CheckSettings());
  if (report.difference) return fail(ssaopt::client::formatReport(report).c_str());
  std::string printed = ssaopt::client::printProgram(*transformed);
  std::string emitted = ssaopt::client::emitC(*transformed).text;
  std::printf("%s\n", printed.c_str());
  // The branch is decided, so the false branch and its assignment of 0 are gone.
  if (printed.find("command = 0") != std::string::npos) return fail("the false branch is still there");
  if (emitted.find("ssaopt_step") == std::string::npos) return fail("no step function in the C code");
  return true;
}

}  // namespace

int main(int argc, char** argv) {
  bool ownController = argc > 1 && std::strcmp(argv[1], "own-controller") == 0;
  std::unique_ptr<ssaopt::PoolMemController> pool(ownController ? new ssaopt::PoolMemController : nullptr);
  ssaopt::PoolMemController::Scope scope(pool.get());
  KvCSSAControl control;
  control.boot();
  bool ok = transformAndCheck();
  control.shutdown();
  return ok ? 0 : 1;
}

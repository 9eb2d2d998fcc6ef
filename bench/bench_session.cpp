#include "bench_session.h"

#include <cstdlib>
#include <iostream>
#include <map>
#include <utility>

#include "passes.h"
#include "ssaopt/client/front_end.h"

namespace ssaopt::bench {

const std::string& programText(Shape shape, std::size_t statements) {
  static std::map<std::pair<Shape, std::size_t>, std::string> texts;
  auto [it, made] = texts.try_emplace({shape, statements});
  if (made) it->second = makeControllerProgram(statements, shape);
  return it->second;
}

Session::Session() { m_Control.boot(); }

Session::~Session() {
  m_pProgram.reset();
  m_Control.shutdown();
}

void Session::load(const std::string& text) {
  client::LoadResult loaded = client::loadProgram(text);
  if (!loaded.program) {
    std::cerr << "the front end rejected a benchmark program\n";
    std::abort();
  }
  m_pProgram = std::move(loaded.program);
}

void Session::runPipelineUpTo(const std::string& name) {
  for (const std::string& step : tool::defaultPipeline()) {
    if (step == name) return;
    tool::findPass(step)->run(*m_pProgram);
  }
}

}  // namespace ssaopt::bench

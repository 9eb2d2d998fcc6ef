#include "bench_session.h"

#include <cstdlib>
#include <iostream>
#include <map>
#include <utility>

#include "ssaopt/client/front_end.h"
#include "ssaopt/client/pipeline.h"

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
  Pipeline before;
  for (const PipelineStep* pStep : typicalRun()) {
    if (pStep->name == name) break;
    before.push_back(pStep);
  }
  client::runPipeline(*m_pProgram, before);
}

}  // namespace ssaopt::bench

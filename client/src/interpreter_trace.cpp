// Traces: how they read, and where two of them part.
#include <algorithm>
#include <cmath>

#include "ssaopt/client/interpreter.h"
#include "ssaopt/client/numbers.h"

namespace ssaopt::client {

namespace {

// Exact, except that the two zeros are one value and NaN is NaN: the comparison asks whether an
// observer could tell the programs apart, and C code compares 0.0 == -0.0 as equal.
bool sameNumber(double a, double b) { return a == b || (std::isnan(a) && std::isnan(b)); }

bool sameObservation(const Observation& a, const Observation& b) {
  return a.variable == b.variable && a.isArray == b.isArray && a.values.size() == b.values.size() &&
         std::equal(a.values.begin(), a.values.end(), b.values.begin(), sameNumber);
}

bool sameEvent(const Event& a, const Event& b) {
  return a.kind == b.kind && a.step == b.step && a.name == b.name &&
         a.observations.size() == b.observations.size() &&
         std::equal(a.observations.begin(), a.observations.end(), b.observations.begin(), sameObservation);
}

std::string formatObservation(const Observation& observation) {
  std::string text = observation.variable + (observation.isArray ? " = [" : " = ");
  for (std::size_t i = 0; i < observation.values.size(); ++i)
    text += (i ? ", " : "") + formatNumber(observation.values[i]);
  return text + (observation.isArray ? "]" : "");
}

// What a trace shows at event `i`: the event, or the ending once the events are over.
std::string shownAt(const Trace& trace, std::size_t i) {
  return i < trace.events.size() ? formatEvent(trace.events[i]) : formatEnding(trace);
}

std::uint64_t stepAt(const Trace& trace, std::size_t i) {
  return i < trace.events.size() ? trace.events[i].step : trace.step;
}

}  // namespace

bool isConclusive(const Trace& trace) {
  return trace.ending == Ending::Completed || trace.ending == Ending::Fault;
}

std::string formatEvent(const Event& event) {
  if (event.kind == Event::Kind::Output)
    return "output " +
           (event.observations.empty() ? event.name : formatObservation(event.observations.front()));
  std::string text = "step " + std::to_string(event.step) + ": extern " + event.name + "(";
  for (std::size_t i = 0; i < event.observations.size(); ++i)
    text += (i ? ", " : "") + formatObservation(event.observations[i]);
  return text + ")";
}

std::string formatEnding(const Trace& trace) {
  std::string step = std::to_string(trace.step);
  switch (trace.ending) {
    case Ending::Completed:
      return "completed " + step + (trace.step == 1 ? " step" : " steps");
    case Ending::Fault:
      return "fault in step " + step + ": " + trace.detail;
    default:
      return "inconclusive in step " + step + ": " + trace.detail;
  }
}

std::string formatTrace(const Trace& trace) {
  std::string text;
  for (const Event& event : trace.events) text += formatEvent(event) + "\n";
  return text + formatEnding(trace) + " (" + std::to_string(trace.statements) + " statements)\n";
}

std::optional<TraceDifference> compareTraces(const Trace& original, const Trace& transformed) {
  std::size_t common = std::min(original.events.size(), transformed.events.size());
  std::size_t i = 0;
  while (i < common && sameEvent(original.events[i], transformed.events[i])) ++i;
  bool endsAlike = original.events.size() == transformed.events.size() &&
                   formatEnding(original) == formatEnding(transformed);
  if (i == common && endsAlike) return std::nullopt;
  return TraceDifference{std::min(stepAt(original, i), stepAt(transformed, i)), shownAt(original, i),
                         shownAt(transformed, i)};
}

}  // namespace ssaopt::client

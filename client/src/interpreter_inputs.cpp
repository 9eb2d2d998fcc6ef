// The interpreter's input streams: seeded pseudo-random values that each variable can hold, or values
// listed in a text.
#include <algorithm>
#include <cmath>
#include <cstdlib>
#include <iterator>
#include <sstream>

#include "ssaopt/client/data_types.h"
#include "ssaopt/client/interpreter.h"
#include "ssaopt/client/variable.h"

namespace ssaopt::client {

namespace {

// Inputs of floating-point variables without saturation stay within this magnitude, so that sums and
// products of a few of them stay finite, where rounding differences would be hard to read.
constexpr double kFloatMagnitude = 1e6;

// Of every four values, one is a border or next to 0 and one a small number, since programs tend to
// go wrong at borders and to compare with small constants (modes, states, counts); the others spread
// over the whole domain.
constexpr std::uint64_t kKindsOfValue = 4;
constexpr std::uint64_t kBorderOrZero = 0;
constexpr std::uint64_t kSmall = 1;
// Small numbers are those up to this magnitude (in stored integers, for a scaled variable).
constexpr double kSmallMagnitude = 8.0;

// splitmix64, from "Fast splittable pseudorandom number generators" (2014): the state moves by an odd
// constant and the output mixes it, so every seed starts a sequence of full period 2^64.
std::uint64_t splitmix64(std::uint64_t& state) {
  std::uint64_t z = (state += 0x9E3779B97F4A7C15u);
  z = (z ^ (z >> 30)) * 0xBF58476D1CE4E5B9u;
  z = (z ^ (z >> 27)) * 0x94D049BB133111EBu;
  return z ^ (z >> 31);
}

std::uint64_t fnv1a(const std::string& text) {
  std::uint64_t hash = 0xCBF29CE484222325u;
  for (unsigned char c : text) hash = (hash ^ c) * 0x100000001B3u;
  return hash;
}

// The values a variable can take as input. On a grid, value n stands for n * lsb + offset, n integral
// from `low` to `high`; otherwise every number from `low` to `high`.
struct Domain {
  bool grid;
  double low;
  double high;
  double lsb = 1.0;
  double offset = 0.0;
};

// A scaled variable's stored integer ranges over its type, and saturation narrows what it stands for.
Domain scaledDomain(const KvCCfgSFVariable& variable) {
  const KV_Scaling& scaling = *variable.getScaling();
  Domain domain{true, *typeMinimum(variable.getDataType()), *typeMaximum(variable.getDataType()),
                scaling.getLSB(), scaling.getOffset()};
  if (variable.isLowerBorderSaturated())
    domain.low = std::max(domain.low, std::ceil((variable.getLowerLimit() - domain.offset) / domain.lsb));
  if (variable.isUpperBorderSaturated())
    domain.high = std::min(domain.high, std::floor((variable.getUpperLimit() - domain.offset) / domain.lsb));
  return domain;
}

Domain floatDomain(const KvCCfgSFVariable& variable) {
  double low = variable.isLowerBorderSaturated() ? variable.getLowerLimit() : -kFloatMagnitude;
  double high = variable.isUpperBorderSaturated() ? variable.getUpperLimit() : kFloatMagnitude;
  if (!std::isfinite(low) || low > high) low = std::min(high, 0.0) - kFloatMagnitude;
  if (!std::isfinite(high)) high = std::max(low, 0.0) + kFloatMagnitude;
  return Domain{false, low, high};
}

// The type's values within the saturation limits (all of them where the limits leave none).
Domain integerDomain(const KvCCfgSFVariable& variable) {
  Domain domain{true, *typeMinimum(variable.getDataType()), *typeMaximum(variable.getDataType())};
  double low = variable.isLowerBorderSaturated() ? std::ceil(variable.getLowerLimit()) : domain.low;
  double high = variable.isUpperBorderSaturated() ? std::floor(variable.getUpperLimit()) : domain.high;
  if (std::max(low, domain.low) <= std::min(high, domain.high)) {
    domain.low = std::max(low, domain.low);
    domain.high = std::min(high, domain.high);
  }
  return domain;
}

Domain domainOf(const KvCCfgSFVariable& variable) {
  if (isFloatType(variable.getDataType())) return floatDomain(variable);
  if (variable.isScaled()) return scaledDomain(variable);
  return integerDomain(variable);
}

double uniformIn(const Domain& domain, std::uint64_t random) {
  if (!domain.grid)
    return domain.low + static_cast<double>(random >> 11) * 0x1p-53 * (domain.high - domain.low);
  double span = domain.high - domain.low + 1.0;
  return domain.low + static_cast<double>(random % static_cast<std::uint64_t>(span));
}

// Where 0 lies in the domain: on a grid, the stored integer that stands for 0.
double zeroOf(const Domain& domain) { return domain.grid ? std::round(-domain.offset / domain.lsb) : 0.0; }

// The borders and the values around 0, brought into the domain.
double borderOrZeroIn(const Domain& domain, std::uint64_t random) {
  double zero = zeroOf(domain);
  const double candidates[] = {domain.low, domain.high, zero, zero + 1.0, zero - 1.0};
  return std::clamp(candidates[random % std::size(candidates)], domain.low, domain.high);
}

Domain smallPartOf(const Domain& domain) {
  Domain small = domain;
  double zero = zeroOf(domain);
  small.low = std::max(domain.low, zero - kSmallMagnitude);
  small.high = std::min(domain.high, zero + kSmallMagnitude);
  return small.low <= small.high ? small : domain;
}

double positionIn(const Domain& domain, std::uint64_t& state) {
  std::uint64_t kind = splitmix64(state) % kKindsOfValue;
  if (kind == kBorderOrZero) return borderOrZeroIn(domain, splitmix64(state));
  return uniformIn(kind == kSmall ? smallPartOf(domain) : domain, splitmix64(state));
}

// Any raw number becomes a value the variable holds once stored: saturation takes it back within the
// limits even where the domain is empty, between two values of the scaling.
double valueOf(const KvCCfgSFVariable& variable, std::uint64_t& state) {
  Domain domain = domainOf(variable);
  double position = domain.low <= domain.high ? positionIn(domain, state) : domain.low;
  double raw = domain.grid ? position * domain.lsb + domain.offset : position;
  return storedValue(variable, raw);
}

bool parseNumber(const std::string& token, double& number) {
  char* pEnd = nullptr;
  number = std::strtod(token.c_str(), &pEnd);
  return !token.empty() && *pEnd == '\0';
}

}  // namespace

std::optional<double> SeededInputs::next(const KvCCfgSFVariable& variable) {
  auto found = m_States.find(&variable);
  if (found == m_States.end()) {
    std::uint64_t mixed = m_Seed;
    found = m_States.emplace(&variable, splitmix64(mixed) ^ fnv1a(variable.getName())).first;
  }
  return valueOf(variable, found->second);
}

std::optional<ListedInputs> ListedInputs::parse(const std::string& text, std::string& error) {
  ListedInputs inputs;
  std::istringstream lines(text);
  int number = 0;
  for (std::string line; std::getline(lines, line);) {
    ++number;
    std::istringstream tokens(line.substr(0, line.find('#')));
    std::string name;
    if (!(tokens >> name)) continue;
    if (!inputs.m_Values.count(name)) inputs.m_Names.push_back(name);
    std::deque<double>& values = inputs.m_Values[name];
    double value = 0.0;
    bool wellFormed = !parseNumber(name, value);
    for (std::string token; wellFormed && tokens >> token;) {
      wellFormed = parseNumber(token, value);
      values.push_back(value);
    }
    if (!wellFormed) {
      error = "line " + std::to_string(number) + ": expected a variable name and numbers";
      return std::nullopt;
    }
  }
  return inputs;
}

std::optional<double> ListedInputs::next(const KvCCfgSFVariable& variable) {
  auto found = m_Values.find(variable.getName());
  if (found == m_Values.end() || found->second.empty()) return std::nullopt;
  double value = found->second.front();
  found->second.pop_front();
  return value;
}

}  // namespace ssaopt::client

// What the makers of the benchmark shapes share: a random sequence that is the same on every
// platform, and a writer of procedure bodies that counts the statements it writes.
#pragma once

#include <cstddef>
#include <cstdint>
#include <sstream>
#include <string>

namespace ssaopt::bench {

// splitmix64: the same seed gives the same program on every platform.
class Random {
public:
  explicit Random(std::uint64_t seed) : m_State(seed) {}
  int below(int bound) { return static_cast<int>(next() % static_cast<std::uint64_t>(bound)); }

private:
  std::uint64_t next() {
    std::uint64_t z = (m_State += 0x9e3779b97f4a7c15ULL);
    z = (z ^ (z >> 30)) * 0xbf58476d1ce4e5b9ULL;
    z = (z ^ (z >> 27)) * 0x94d049bb133111ebULL;
    return z ^ (z >> 31);
  }
  std::uint64_t m_State;
};

// Statements, labels and jumps of one procedure body; a statement counts, a label or a jump does not.
class BodyText {
public:
  explicit BodyText(std::ostringstream& out) : m_Out(out) {}

  void line(const std::string& statement) {
    m_Out << "  " << statement << "\n";
    ++m_Statements;
  }
  void jump(const std::string& label) { m_Out << "  goto " << label << ";\n"; }
  void branch(const std::string& condition, const std::string& yes, const std::string& no) {
    line("if " + condition + " goto " + yes + " else " + no + ";");
  }
  void open(const std::string& label) { m_Out << label << ":\n"; }
  // A label of its own: a prefix and a number that no other label of the body has.
  std::string label(const std::string& prefix = "L") { return prefix + std::to_string(m_Labels++); }
  std::size_t statements() const { return m_Statements; }

private:
  std::ostringstream& m_Out;
  std::size_t m_Statements = 0;
  int m_Labels = 0;
};

// The variables that the controller-like shapes share (inputs in0.., temporaries t0.., states s0..,
// outputs out0..) and a writer's random picks among them.
constexpr int kInputs = 8;
constexpr int kTemporaries = 16;
constexpr int kStates = 8;
constexpr int kOutputs = 4;

class ControllerNames {
public:
  explicit ControllerNames(Random& random) : m_Random(random) {}

  std::string input() { return "in" + std::to_string(m_Random.below(kInputs)); }
  std::string temp() { return "t" + std::to_string(m_Random.below(kTemporaries)); }
  std::string state() { return "s" + std::to_string(m_Random.below(kStates)); }
  std::string output() { return "out" + std::to_string(m_Random.below(kOutputs)); }

protected:
  Random& m_Random;
};

inline void declareNumbered(std::ostringstream& out, int count, const char* type, const std::string& name,
                            const char* attributes) {
  for (int i = 0; i < count; ++i) out << "var " << type << " " << name << i << attributes << ";\n";
}

}  // namespace ssaopt::bench

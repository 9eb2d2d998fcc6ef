// Reports of the module: the host's internal error message, the internal-information switch and the
// internal-consistency report. The library never throws or returns error codes; it reports and goes
// on. A host (or a test) installs a ReportSink to receive the reports instead of standard error.
#pragma once

#include <string>
#include <vector>

// Source reference of a host message; the library always passes null.
class KvCSrcRef;

// The host's message numbers used by the library.
enum : int {
  kKvErrorKindInternal = 3,     // kind of an internal error
  kKvMessageInternalError = 7,  // "Internal error. Error code: %s%d."
  // The same with what went wrong: "Internal error. Error code: %s%d: %s."
  kKvMessageInternalErrorWithDetail = 8,
};

// Emits host message `number` of `kind`. Message 7 takes the reporting class's name (const char*)
// and a source line (int) and reads "Internal error. Error code: <class><line>."; message 8 takes a
// text (const char*) after them and reads "Internal error. Error code: <class><line>: <text>.".
void ERR_EmitErrorMessage(int kind, const KvCSrcRef* source, int number, ...);

// The internal-information switch: consistency checks run only while it is true.
bool ShowInternalInfo();

namespace ssaopt {

void setShowInternalInfo(bool on);

// Receives the module's reports. The default sink writes them to standard error.
class ReportSink {
public:
  virtual ~ReportSink() = default;
  // A host message, already formatted (for message 7: "Internal error. Error code: KvCFoo123.").
  virtual void hostMessage(int kind, int number, const std::string& text) = 0;
  // A failed internal consistency condition.
  virtual void consistencyFailure(const char* file, int line, const char* condition) = 0;
};

// Installs `sink` (null restores the default) and returns the previous one.
ReportSink* setReportSink(ReportSink* sink);

// A sink that records every report, and installs itself for its lifetime (restoring the previous sink
// when it goes). Tests and the command-line tool's --verify use it.
class ReportLog : public ReportSink {
public:
  struct Consistency {
    std::string file;
    int line;
    std::string condition;
  };

  ReportLog();
  ~ReportLog() override;
  ReportLog(const ReportLog&) = delete;
  ReportLog& operator=(const ReportLog&) = delete;

  void hostMessage(int kind, int number, const std::string& text) override;
  void consistencyFailure(const char* file, int line, const char* condition) override;

  const std::vector<std::string>& messages() const { return m_Messages; }
  const std::vector<Consistency>& consistencyFailures() const { return m_Consistency; }
  bool empty() const { return m_Messages.empty() && m_Consistency.empty(); }
  std::size_t count() const { return m_Messages.size() + m_Consistency.size(); }
  // True when an internal error with this class name and line ("KvCPhiFunction", 93) was reported,
  // with or without a text.
  bool hasInternalError(const std::string& className, int line) const;
  // True when the consistency condition with this text failed.
  bool hasConsistencyFailure(const std::string& condition) const;
  void clear();

private:
  ReportSink* m_pPrevious;
  std::vector<std::string> m_Messages;
  std::vector<Consistency> m_Consistency;
};

// Reports the host's internal error for a case that a consistent graph never reaches: kind 3,
// message 7, the reporting class name and source line.
void reportInternalError(const char* className, int line);
// The same with a text that says what went wrong (message 8).
void reportInternalError(const char* className, int line, const char* detail);

// Reports a failed internal consistency condition (file, line, condition text).
void reportConsistencyFailure(const char* file, int line, const char* condition);

}  // namespace ssaopt

// Checks an internal consistency condition while ShowInternalInfo() is true. `text` is the condition
// as the module reports it, `file` and `line` name where it stands. The expression is not evaluated
// while the switch is off.
#define KV_CONSISTENCY_CHECK(expr, text, file, line)                                         \
  do {                                                                                       \
    if (ShowInternalInfo() && !(expr)) ::ssaopt::reportConsistencyFailure(file, line, text); \
  } while (0)

#include "ssaopt/frame/report.h"

#include <cstdarg>
#include <cstdio>

namespace {

bool g_ShowInternalInfo = false;

class StandardErrorSink final : public ssaopt::ReportSink {
public:
  void hostMessage(int, int, const std::string& text) override { std::fprintf(stderr, "%s\n", text.c_str()); }
  void consistencyFailure(const char* file, int line, const char* condition) override {
    std::fprintf(stderr, "Internal consistency check failed: %s(%d): %s\n", file, line, condition);
  }
};

StandardErrorSink g_StandardErrorSink;
ssaopt::ReportSink* g_pSink = &g_StandardErrorSink;

std::string formatHostMessage(int number, std::va_list args) {
  if (number != kKvMessageInternalError && number != kKvMessageInternalErrorWithDetail)
    return "Host message " + std::to_string(number) + ".";
  const char* className = va_arg(args, const char*);
  int line = va_arg(args, int);
  std::string text =
      "Internal error. Error code: " + std::string(className ? className : "") + std::to_string(line);
  if (number == kKvMessageInternalErrorWithDetail) {
    const char* detail = va_arg(args, const char*);
    text += ": " + std::string(detail ? detail : "");
  }
  return text + ".";
}

}  // namespace

void ERR_EmitErrorMessage(int kind, const KvCSrcRef*, int number, ...) {
  std::va_list args;
  va_start(args, number);
  std::string text = formatHostMessage(number, args);
  va_end(args);
  g_pSink->hostMessage(kind, number, text);
}

bool ShowInternalInfo() { return g_ShowInternalInfo; }

namespace ssaopt {

void setShowInternalInfo(bool on) { g_ShowInternalInfo = on; }

ReportSink* setReportSink(ReportSink* sink) {
  ReportSink* previous = g_pSink;
  g_pSink = sink ? sink : &g_StandardErrorSink;
  return previous;
}

ReportLog::ReportLog() : m_pPrevious(setReportSink(this)) {}

ReportLog::~ReportLog() { setReportSink(m_pPrevious); }

void ReportLog::hostMessage(int, int, const std::string& text) { m_Messages.push_back(text); }

void ReportLog::consistencyFailure(const char* file, int line, const char* condition) {
  m_Consistency.push_back({file, line, condition});
}

bool ReportLog::hasInternalError(const std::string& className, int line) const {
  std::string code = "Internal error. Error code: " + className + std::to_string(line);
  for (const std::string& message : m_Messages)
    if (message.compare(0, code.size(), code) == 0 && message.size() > code.size() &&
        (message[code.size()] == '.' || message[code.size()] == ':'))
      return true;
  return false;
}

bool ReportLog::hasConsistencyFailure(const std::string& condition) const {
  for (const Consistency& failure : m_Consistency)
    if (failure.condition == condition) return true;
  return false;
}

void ReportLog::clear() {
  m_Messages.clear();
  m_Consistency.clear();
}

void reportInternalError(const char* className, int line) {
  ERR_EmitErrorMessage(kKvErrorKindInternal, nullptr, kKvMessageInternalError, className, line);
}

void reportInternalError(const char* className, int line, const char* detail) {
  ERR_EmitErrorMessage(kKvErrorKindInternal, nullptr, kKvMessageInternalErrorWithDetail, className, line,
                       detail);
}

void reportConsistencyFailure(const char* file, int line, const char* condition) {
  g_pSink->consistencyFailure(file, line, condition);
}

}  // namespace ssaopt

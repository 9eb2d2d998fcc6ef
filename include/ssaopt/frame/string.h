// The host string class: procedure and call names.
#pragma once

#include <string>

#include "ssaopt/frame/memory.h"

class BxCXString {
public:
  SSAOPT_MODULE_ALLOCATED

  BxCXString() = default;
  BxCXString(const char* text) : m_Text(text ? text : "") {}  // NOLINT: implicit, as the host's is
  // The text of `number`: hexadecimal ("0x1f") when `hexadecimal` is set, else decimal. `plain` is
  // accepted for the host's signature; every combination gives different texts for different numbers.
  BxCXString(unsigned long number, bool hexadecimal, bool plain);

  const char* cstring() const { return m_Text.c_str(); }
  std::size_t length() const { return m_Text.size(); }
  bool empty() const { return m_Text.empty(); }

  friend BxCXString operator+(const BxCXString& a, const BxCXString& b) {
    BxCXString result(a);
    result.m_Text += b.m_Text;
    return result;
  }
  // Three-way comparison by characters: negative, 0 or positive.
  friend int compare(const BxCXString& a, const BxCXString& b) { return a.m_Text.compare(b.m_Text); }
  friend bool operator==(const BxCXString& a, const BxCXString& b) { return a.m_Text == b.m_Text; }
  friend bool operator!=(const BxCXString& a, const BxCXString& b) { return a.m_Text != b.m_Text; }
  friend bool operator<(const BxCXString& a, const BxCXString& b) { return a.m_Text < b.m_Text; }

private:
  std::basic_string<char, std::char_traits<char>, ssaopt::ModuleAllocator<char>> m_Text;
};

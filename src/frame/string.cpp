#include "ssaopt/frame/string.h"

#include <cstdio>

BxCXString::BxCXString(unsigned long number, bool hexadecimal, bool /*plain*/) {
  char text[32];
  std::snprintf(text, sizeof text, hexadecimal ? "0x%lx" : "%lu", number);
  m_Text = text;
}

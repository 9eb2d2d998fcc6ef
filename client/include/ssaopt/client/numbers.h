// Numbers as the textual format writes them.
#pragma once

#include <string>

namespace ssaopt::client {

// The shortest text that reads back as the same double: "3", "0.1", "-2.5e-07", "inf", "-inf", "nan".
std::string formatNumber(double number);

}  // namespace ssaopt::client

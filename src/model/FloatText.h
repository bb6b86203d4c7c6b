#pragma once

#include <string>

// A float as the stream's default formatting writes it ("%g", six significant digits) when
// that text reads back to the same float, else with the fewest further digits that do (at
// most nine), so that written blocks read back to equal values. Whole numbers are always
// written without an exponent ("12", "10000000"), so that readers that take an integer
// read them back whole.
std::string FloatText(float value);

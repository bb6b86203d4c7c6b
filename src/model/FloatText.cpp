#include "model/FloatText.h"

#include <cmath>
#include <cstdio>
#include <cstdlib>

std::string FloatText(float value) {
    char buf[64];
    if (std::isfinite(value) && std::trunc(value) == value && std::fabs(value) < 1e15f) {
        std::snprintf(buf, sizeof buf, "%.0f", double(value));
        return buf;
    }
    for (int digits = 6; digits <= 9; ++digits) {
        std::snprintf(buf, sizeof buf, "%.*g", digits, double(value));
        if (std::strtof(buf, nullptr) == value)
            break;
    }
    return buf;
}

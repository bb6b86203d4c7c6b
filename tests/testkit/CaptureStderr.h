#pragma once

// The one way the tests capture the error stream: what `f` writes on it, from C++ streams and
// C stdio alike.
#include <gtest/gtest.h>

#include <string>

namespace testkit {

template <typename F>
std::string StdErr(F&& f) {
    ::testing::internal::CaptureStderr();
    f();
    return ::testing::internal::GetCapturedStderr();
}

}  // namespace testkit

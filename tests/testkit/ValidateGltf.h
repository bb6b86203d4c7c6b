#pragma once

// Checks a written scene file with the Khronos glTF validator (tools/validate-gltf.mjs, which
// scripts/install-deps installs into tools/node_modules). Where the validator is not installed
// the check is skipped with the same message everywhere; in CI (the CI variable set), where
// it is always installed, a missing validator is a failure.
#include <gtest/gtest.h>

#include <cstdlib>
#include <fstream>
#include <sstream>
#include <string>

#include "testkit/TempDir.h"

namespace testkit {

inline bool GltfValidatorInstalled() {
    return std::ifstream(CHIRRUP_SOURCE_DIR "/tools/node_modules/gltf-validator/package.json")
               .good() &&
           std::system("node --version >/dev/null 2>&1") == 0;
}

// Expects the validator to report no errors in `path`.
inline void ExpectValidGltf(const std::string& path) {
    if (!GltfValidatorInstalled()) {
        const char* const why = "the glTF validator is not installed (scripts/install-deps)";
        if (std::getenv("CI"))
            ADD_FAILURE() << why;
        else
            GTEST_SKIP() << why;
        return;
    }
    TempDir dir;
    const std::string report = dir / "validator.txt";
    const std::string command =
        "node " CHIRRUP_SOURCE_DIR "/tools/validate-gltf.mjs '" + path + "' >'" + report + "' 2>&1";
    const int status = std::system(command.c_str());
    std::ostringstream text;
    text << std::ifstream(report).rdbuf();
    EXPECT_EQ(status, 0) << text.str();
    EXPECT_NE(text.str().find(": 0 errors"), std::string::npos) << text.str();
}

}  // namespace testkit

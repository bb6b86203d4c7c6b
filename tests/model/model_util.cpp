#include <filesystem>
#include <fstream>

#include "model/ModelTestUtil.h"

TempDir::TempDir(const std::string& name)
    : path_(std::string(CHIRRUP_BINARY_DIR) + "/test-tmp/model/" + name) {
    std::filesystem::remove_all(path_);
    std::filesystem::create_directories(path_);
}

TempDir::~TempDir() {
    std::error_code ignored;
    std::filesystem::remove_all(path_, ignored);
}

bool WriteTextFile(const std::string& path, const std::string& text) {
    std::ofstream out(path, std::ios::binary);
    out << text;
    return bool(out);
}

#pragma once

#include <string>
#include <vector>

// The lines of an X resource file as Xt's fallback resources want them: comment lines ("!")
// and blank lines dropped, lines ending in a backslash joined with the next.
class KLResourceLines {
  public:
    explicit KLResourceLines(const std::string& fileText);
    // Null-terminated array of the lines, valid while this object lives.
    const char* const* Lines() const { return pointers_.data(); }
    size_t Count() const { return lines_.size(); }
    const std::string& Line(size_t i) const { return lines_[i]; }

  private:
    std::vector<std::string> lines_;
    std::vector<const char*> pointers_;
};

#include "toolkit/xm/KLResourceLines.h"

#include <sstream>

KLResourceLines::KLResourceLines(const std::string& fileText) {
    std::istringstream in(fileText);
    std::string line, pending;
    bool continuing = false;
    while (std::getline(in, line)) {
        if (!line.empty() && line.back() == '\r')
            line.pop_back();
        if (!continuing) {
            size_t first = line.find_first_not_of(" \t");
            if (first == std::string::npos || line[first] == '!')
                continue;
        }
        // An odd number of trailing backslashes continues the line.
        size_t slashes = 0;
        while (slashes < line.size() && line[line.size() - 1 - slashes] == '\\')
            slashes++;
        if (slashes % 2 == 1) {
            pending += line.substr(0, line.size() - 1);
            continuing = true;
            continue;
        }
        pending += line;
        lines_.push_back(pending);
        pending.clear();
        continuing = false;
    }
    if (!pending.empty())
        lines_.push_back(pending);
    for (const std::string& l : lines_)
        pointers_.push_back(l.c_str());
    pointers_.push_back(nullptr);
}

#include "toolkit/CueStatement.h"

#include <istream>

bool CueStatement::Read(std::istream& in) {
    line_.clear();
    Clear();
    if (!in.good())
        return false;
    bool any = false;
    std::streambuf* buf = in.rdbuf();
    for (;;) {
        const int c = buf->sbumpc();
        if (c == std::char_traits<char>::eof()) {
            in.setstate(std::ios::eofbit);
            if (!any) {
                in.setstate(std::ios::failbit);
                return false;
            }
            break;
        }
        any = true;
        if (c == '\n')
            break;
        if (line_.size() < kMaxLine)
            line_.push_back(char(c));
    }
    ++lineNumber_;
    Split(line_);
    return true;
}

void KLEatBeginEndBlock(std::istream& in) {
    CueStatement s;
    int depth = 1;
    while (depth > 0 && s.Read(in)) {
        if (s.Matches("begin"))
            ++depth;
        else if (s.Matches("end"))
            --depth;
    }
}

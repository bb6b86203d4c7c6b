#pragma once

#include <iosfwd>
#include <string>

#include "toolkit/CueTokenList.h"

// One statement of the program's line-oriented files: one line of text split into tokens (see
// CueTokenList). Read takes the next line of a stream; a line longer than kMaxLine bytes is
// cut there (the rest of the line is read and dropped) so no file can make a statement grow
// without bound.
class CueStatement : public CueTokenList {
  public:
    static constexpr size_t kMaxLine = 1 << 20;

    // Reads the next line of `in` into this statement. False at the end of the stream (or
    // when the stream has failed) with no line read; a last line without an end of line
    // still counts.
    bool Read(std::istream& in);
    // The line as read, before splitting.
    const std::string& Line() const { return line_; }
    // Number of lines read by this statement so far (the line number of the last one).
    int LineNumber() const { return lineNumber_; }

  private:
    std::string line_;
    int lineNumber_ = 0;
};

// Skips statements of `in` up to and including the "end" that closes a block whose "begin"
// statement has just been read; nested begin ... end blocks inside it are skipped whole.
void KLEatBeginEndBlock(std::istream& in);

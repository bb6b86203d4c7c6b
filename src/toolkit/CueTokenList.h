#pragma once

#include <string>
#include <vector>

// The tokens of one statement line. Tokens are separated by runs of blanks and tabs; a double
// quote starts a quoted stretch that runs to the next double quote (or the end of the line
// when none follows) and may hold blanks and tabs; the quotes themselves are not part of the
// token. Quoted and unquoted stretches that touch form one token ("a"b is ab), and "" alone
// is an empty token. Any other byte, NUL and control characters included, is kept as it is.
class CueTokenList {
  public:
    CueTokenList() = default;
    explicit CueTokenList(const std::string& line) { Split(line); }

    // Replaces the tokens by those of `line` (a trailing carriage return is ignored).
    void Split(const std::string& line);
    void Clear() { tokens_.clear(); }

    int Count() const { return int(tokens_.size()); }
    // True when token i exists and equals `text` exactly (case-sensitive).
    bool Matches(const char* text, int i = 0) const;
    // Token i as text; null when there is no token i.
    const char* ArgText(int i) const;
    // Token i read as a decimal integer like atoi: leading digits only, 0 when there are
    // none or no token i, saturated at the 32-bit range.
    int ArgInt(int i) const;
    // Token i read as a number like atof: 0 when it does not begin with a number or there is
    // no token i; infinities and NaN give 0, and values beyond the float range saturate.
    float ArgFloat(int i) const;
    double ArgDouble(int i) const;
    const std::vector<std::string>& Tokens() const { return tokens_; }

  private:
    std::vector<std::string> tokens_;
};

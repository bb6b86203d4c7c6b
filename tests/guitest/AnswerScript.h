#pragma once

#include <X11/Intrinsic.h>

#include <functional>
#include <vector>

namespace guitest {

// Steps run from a short timeout while the test waits in a modal loop (a dialog's Show, a
// question): each step is tried every 20 ms until it returns true, then the next is tried.
class AnswerScript {
  public:
    explicit AnswerScript(std::vector<std::function<bool()>> steps);
    ~AnswerScript();
    bool Finished() const { return next_ >= steps_.size(); }

  private:
    static void tick(XtPointer self, XtIntervalId*);
    std::vector<std::function<bool()>> steps_;
    size_t next_ = 0;
    XtIntervalId timer_ = 0;
};

}  // namespace guitest

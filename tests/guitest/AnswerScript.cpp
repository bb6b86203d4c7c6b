#include "guitest/AnswerScript.h"

#include "toolkit/xm/KLXmGnome.h"

namespace guitest {

AnswerScript::AnswerScript(std::vector<std::function<bool()>> steps) : steps_(std::move(steps)) {
    timer_ = XtAppAddTimeOut(KLXmGnome::AppContext(), 20, tick, this);
}

AnswerScript::~AnswerScript() {
    if (timer_)
        XtRemoveTimeOut(timer_);
}

void AnswerScript::tick(XtPointer self, XtIntervalId*) {
    auto* script = static_cast<AnswerScript*>(self);
    script->timer_ = 0;
    if (script->next_ < script->steps_.size() && script->steps_[script->next_]())
        script->next_++;
    if (script->next_ < script->steps_.size())
        script->timer_ = XtAppAddTimeOut(KLXmGnome::AppContext(), 20, tick, self);
}

}  // namespace guitest

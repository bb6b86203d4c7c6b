#include "toolkit/KLTimerBeat.h"

#include <algorithm>
#include <vector>

#include "toolkit/KLTimer.h"
#include "toolkit/TimerRegistry.h"

namespace {
// Never destroyed: a timer held by a static may be destroyed after this list would be, and
// it still takes itself off the list.
std::vector<KLTimer*>& timers() {
    static auto* live = new std::vector<KLTimer*>;
    return *live;
}
bool running = false;
KLTimerBeat::Driver driver = nullptr;
}  // namespace

void TimerRegistry::Add(KLTimer* timer) {
    timers().push_back(timer);
}

void TimerRegistry::Remove(KLTimer* timer) {
    auto& live = timers();
    live.erase(std::remove(live.begin(), live.end(), timer), live.end());
}

void TimerRegistry::FireAll() {
    // A trigger may destroy its own or another timer: walk a copy and skip the dead.
    std::vector<KLTimer*> snapshot = timers();
    for (KLTimer* timer : snapshot) {
        auto& live = timers();
        if (std::find(live.begin(), live.end(), timer) != live.end())
            timer->fire_due();
    }
}

void KLTimerBeat::start() {
    running = true;
    if (driver)
        driver(true);
}

void KLTimerBeat::stop() {
    running = false;
    if (driver)
        driver(false);
}

bool KLTimerBeat::Running() {
    return running;
}

void KLTimerBeat::Tick() {
    TimerRegistry::FireAll();
}

void KLTimerBeat::SetDriver(Driver d) {
    driver = d;
}

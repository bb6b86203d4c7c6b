#pragma once

class KLTimer;

// The live timers of the process, for KLTimerBeat::Tick. Event-loop thread only.
class TimerRegistry {
  public:
    static void Add(KLTimer* timer);
    static void Remove(KLTimer* timer);
    // Calls fire_due on every live timer (timers may be destroyed by their triggers).
    static void FireAll();
};

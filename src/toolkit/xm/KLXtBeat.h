#pragma once

// Drives KLTimerBeat from the Xt event loop: while the beat runs, a short timeout fires the
// due triggers of every timer (on the event-loop thread, so triggers may touch widgets).
class KLXtBeat {
  public:
    // Installs the driver (KLTimerBeat::SetDriver); call once the application is open.
    static void Install();
    // Milliseconds between two ticks while the beat runs.
    static constexpr unsigned long kIntervalMs = 5;

  private:
    static void drive(bool run);
    static void tick(void* clientData, unsigned long* id);
};

#pragma once

// The beat that advances every running KLTimer: Tick fires their due triggers. The toolkit
// has no event loop of its own, so the window installs a driver that calls Tick often (a short
// Xt timeout) while the beat runs; start and stop switch the driver on and off.
class KLTimerBeat {
  public:
    using Driver = void (*)(bool run);

    static void start();
    static void stop();
    static bool Running();
    // Fires the due triggers of every live timer.
    static void Tick();
    // The window's driver (null: nobody calls Tick except by hand, as tests do).
    static void SetDriver(Driver driver);
};

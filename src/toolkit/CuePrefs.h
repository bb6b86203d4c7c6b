#pragma once

#include <string>

// Where chirrup looks for files. Everything hangs off the project, a directory named by
// SetProject or, failing that, the environment variable TESSEL_PROJECT:
//
//   WorkEnv()   the project directory itself (the error log "errlog.vx" goes there)
//   MiscDir()   data: keyset descriptions, tracks, sounds   <project>/<TESSEL_MISC_DIR or
//   misc_data> WireDir()   scene ("wire") files                          <project>/wire PixDir()
//   pictures: key-shape and reference images      <project>/pix
//
// With no project all four are null, and relative names are used as they stand, that is
// relative to the current directory. HelpDir() is <Location()>/share/doc/chirrup/html, where
// Location() is the directory above the one that holds the running program.
// The strings returned stay valid until the next SetProject or Refresh.
class CuePrefs {
  public:
    static const char* WorkEnv();
    static const char* MiscDir();
    static const char* WireDir();
    static const char* PixDir();
    static const char* HelpDir();
    static const char* Location();
    static const char* Project();

    // Makes `dir` the project (null or empty: none) and exports it as TESSEL_PROJECT so
    // that programs started from chirrup see it too.
    static void SetProject(const char* dir);
    // The value of an environment variable, or null when it is unset or empty.
    static const char* Variable(const char* name);
    // Forgets what was worked out and reads the environment again.
    static void Refresh();
};

// Feeds arbitrary bytes to the keyset-file and track-file readers of the workspace, in batch
// mode, and saves what was read. The first byte chooses the reader (even: keyset file, odd:
// track file); the rest is the file. Track files are read against the demo keysets, so that
// their key-track blocks find keysets to fill. Runs in a scratch directory that holds the demo
// keysets and, under the demo scene's and sound's names, a tiny scene and a tiny sound (reading
// the real ones every time would leave the fuzzer little time for the readers), so relative
// names in the input resolve there.
#include <unistd.h>

#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <fstream>
#include <string>

#include "workspace/ConsoleGhost.h"
#include "workspace/Imp.h"

namespace {

bool demoLoaded = false;

void setUp() {
    static bool done = false;
    if (done)
        return;
    done = true;
    // Memory-backed when the machine has it: the saves sync their files, and a disk sync per
    // run would cost more than the readers themselves.
    std::string dir = access("/dev/shm", W_OK) == 0 ? "/dev/shm" : "/tmp";
    dir += "/chirrup-fuzz-XXXXXX";
    if (!mkdtemp(dir.data()) || chdir(dir.c_str()) != 0)
        std::abort();
    const std::string source(CHIRRUP_SOURCE_DIR);
    if (symlink((source + "/resources/demo/demo.kset").c_str(), "demo.kset") != 0 ||
        symlink((source + "/fuzz/corpus/scene_fuzz/linear_translation.glb").c_str(), "face.glb") ||
        symlink((source + "/fuzz/corpus/sound_fuzz/tiny16.aiff").c_str(), "dialogue.aiff") != 0)
        std::abort();
    unsetenv("TESSEL_PROJECT");
    theImp.batchMode = 1;
    theGhost = &ConsoleGhost::Instance();
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    setUp();
    if (size == 0)
        return 0;
    const bool track = data[0] & 1;
    {
        std::ofstream out("input", std::ios::binary | std::ios::trunc);
        out.write(reinterpret_cast<const char*>(data + 1), std::streamsize(size - 1));
    }
    if (track) {
        if (!demoLoaded) {
            theImp.LoadKeyset("demo.kset");
            demoLoaded = theImp.keysetCount == 3;
        }
        if (theImp.LoadTrack("input"))
            theImp.SaveTrack("saved.track");
    } else {
        demoLoaded = false;
        if (theImp.LoadKeyset("input") && theImp.keysetCount > 0)
            theImp.SaveKeyset("saved.kset");
    }
    return 0;
}

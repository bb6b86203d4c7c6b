// Imp: apply of the key tracks to a scene file, interactively and in batch mode.
#include <sys/stat.h>

#include <cstring>
#include <iostream>

#include "model/KLEdlEvent.h"
#include "model/KLKeySet.h"
#include "model/KLKeyTrack.h"
#include "scene/KLWire.h"
#include "scene/KLWireSource.h"
#include "scene/OrDagNode.h"
#include "toolkit/KLFilePath.h"
#include "workspace/Ghost.h"
#include "workspace/Imp.h"

void Imp::OpenApplyWire(const char* name) {
    applyEvent.reset();
    applyEvent = std::make_unique<KLEdlEvent>(name, CueTime(), duration, CueTime(), duration);
    theGhost->UpdateApplyDialog(applyEvent.get());
}

int Imp::ApplyWire(KLWireSource* source, const char* keyset, const char* dag, CueTime start,
                   CueTime end, CueTime offset) {
    if (!source || !keyset)
        return 0;
    int result = 0;
    // Every keyset of that name, in slot order; a failure does not stop the later ones.
    for (int i = 0; i < keysetCount; ++i) {
        const char* name = keySets[i]->Name();
        if (name && !std::strcmp(name, keyset))
            result = keyTracks[i]->Apply(source, dag, start, end, offset);
    }
    return result;
}

void Imp::BatchApply(const char* keysetFile, const char* trackFile, const char* applyFile,
                     const char* outFile, const char* dag, CueTime offset) {
    std::cerr << "Batch mode." << std::endl;
    std::cerr << "  Reading keyset " << keysetFile << std::endl;
    std::cerr << "  Reading track " << trackFile << std::endl;
    std::cerr << "  Reading apply file " << applyFile << std::endl;
    std::cerr << "  Applying to dag " << dag << " with offset ";
    if (CueTime::binaryIO)
        offset.WriteBinary(std::cerr);
    else
        offset.Write(std::cerr);
    std::cerr << std::endl;

    LoadKeyset(keysetFile);
    if (batchStop)
        return;  // no usable scene file: the run ends here
    LoadTrack(trackFile);

    applyEvent.reset();
    applyEvent = std::make_unique<KLEdlEvent>(applyFile, CueTime(), duration, CueTime(), duration);
    // The keyset's scene has given its key channels and batch mode shows nothing: when the
    // apply scene is the same file it is taken over instead of read again, and otherwise let
    // go before the apply scene is read, so that two scenes are never in memory together.
    const char* wireDir = GetWireDirectory();
    const std::string applyPath =
        applyFile[0] != '/' && wireDir ? KLFilePath::Join(wireDir, applyFile) : applyFile;
    struct stat a, b;
    if (wireSource && wireSource->Valid() && ::stat(wireSource->Path().c_str(), &a) == 0 &&
        ::stat(applyPath.c_str(), &b) == 0 && a.st_dev == b.st_dev && a.st_ino == b.st_ino) {
        applyEvent->wire = std::move(wireSource);
    } else {
        wireSource.reset();
        applyEvent->OpenWire();
    }
    KLWireSource* target = applyEvent->wire.get();
    if (!target || !target->Valid()) {
        std::cerr << "Could not read apply file " << applyFile;
        if (target && !target->ErrorText().empty())
            std::cerr << ": " << target->ErrorText();
        std::cerr << std::endl;
        applyEvent->CloseWire();
        return;
    }

    std::string dagName = dag ? dag : "";
    if (dagName == "VX_ROOT") {
        std::unique_ptr<OrDagNode> root(target->RootNode());
        if (root)
            dagName = KLWire::NodeName(root.get());
    }

    bool failed = false;
    for (int i = 0; i < keysetCount; ++i) {
        std::cerr << "Applying " << keySets[i]->Name() << std::endl;
        if (!ApplyWire(target, keySets[i]->Name(), dagName.c_str(), CueTime(), duration, offset)) {
            failed = true;
            break;
        }
    }
    if (keysetCount == 0) {
        std::cerr << "You must select one or more keysets to apply." << std::endl;
        applyEvent->CloseWire();
        return;
    }
    if (failed)
        std::cerr << "There was an error" << std::endl;
    std::cerr << "  Storing to " << outFile << std::endl;
    applyEvent->StoreWire(outFile);
}

// Imp: apply of the key tracks to a scene file, interactively and in batch mode.
#include <cstring>
#include <iostream>

#include "model/KLEdlEvent.h"
#include "model/KLKeySet.h"
#include "model/KLKeyTrack.h"
#include "scene/KLWire.h"
#include "scene/KLWireSource.h"
#include "scene/OrDagNode.h"
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
    source->Activate();
    int result = 0;
    // Every keyset of that name, in slot order; a failure does not stop the later ones.
    for (int i = 0; i < keysetCount; ++i) {
        const char* name = keySets[i]->Name();
        if (name && !std::strcmp(name, keyset))
            result = keyTracks[i]->Apply(source, dag, start, end, offset);
    }
    if (wireSource)
        wireSource->Activate();
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
    // The keyset's scene has given its key channels; batch mode shows nothing, so it is let go
    // before the apply scene is read, and the two are never in memory together.
    wireSource.reset();

    applyEvent.reset();
    applyEvent = std::make_unique<KLEdlEvent>(applyFile, CueTime(), duration, CueTime(), duration);
    applyEvent->OpenWire();
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

// The six file managers of the main window: what retrieving and storing each kind of file
// does in the workspace.
#include <cstdlib>

#include "model/KLEdlEvent.h"
#include "scene/KLScene.h"
#include "scene/KLWireSource.h"
#include "scene/RawGeometry.h"
#include "toolkit/KLErrHandler.h"
#include "window/KeysetFileManager.h"
#include "window/ReferenceFileManager.h"
#include "window/SoundFileManager.h"
#include "window/TrackFileManager.h"
#include "window/WireFileApplyManager.h"
#include "window/WireFileManager.h"
#include "workspace/Imp.h"

int WireFileManager::RetrieveFile(const char*) {
    return 1;
}
int WireFileManager::StoreFile(const char*) {
    return 1;
}
const char* WireFileManager::DefaultDirectory() {
    return theImp.GetWireDirectory();
}

int WireFileApplyManager::RetrieveFile(const char* name) {
    theImp.OpenApplyWire(name);
    return theImp.applyEvent ? 1 : 0;
}

int WireFileApplyManager::StoreFile(const char* name) {
    KLEdlEvent* event = theImp.applyEvent.get();
    if (!event || !name)
        return 0;
    if (std::getenv("VX_RAWFILE") && event->WireFile()) {
        std::string raw = std::string(name) + ".raw";
        std::string error;
        if (!RawGeometry::Write(event->wire ? event->wire->Path().c_str() : event->WireFile(),
                                raw.c_str(), &error))
            KLError("%s\n", error.c_str());
    }
    event->StoreWire(name);
    return 1;
}

const char* WireFileApplyManager::DefaultDirectory() {
    return theImp.GetWireDirectory();
}

int SoundFileManager::RetrieveFile(const char* name) {
    return theImp.LoadSound(name);
}
int SoundFileManager::StoreFile(const char*) {
    return 1;
}
const char* SoundFileManager::DefaultDirectory() {
    return theImp.GetDataDirectory();
}

int TrackFileManager::RetrieveFile(const char* name) {
    return theImp.LoadTrack(name);
}
int TrackFileManager::StoreFile(const char* name) {
    return theImp.SaveTrack(name);
}
const char* TrackFileManager::DefaultDirectory() {
    return theImp.GetDataDirectory();
}

int KeysetFileManager::RetrieveFile(const char* name) {
    return theImp.LoadKeyset(name);
}
int KeysetFileManager::StoreFile(const char* name) {
    return theImp.SaveKeyset(name);
}
const char* KeysetFileManager::DefaultDirectory() {
    return theImp.GetDataDirectory();
}

int ReferenceFileManager::RetrieveFile(const char* name) {
    return theImp.LoadReference(name);
}
int ReferenceFileManager::StoreFile(const char*) {
    return 0;
}
const char* ReferenceFileManager::DefaultDirectory() {
    return theImp.GetPixDirectory();
}

#include "model/KLEdlEvent.h"

#include "scene/KLWire.h"
#include "scene/KLWireSource.h"
#include "scene/OrDagNode.h"
#include "toolkit/KLFilePath.h"
#include "toolkit/KLStdImp.h"

KLEdlEvent::KLEdlEvent(const char* a_wireFile, CueTime a_sourceIn, CueTime a_sourceOut,
                       CueTime a_destIn, CueTime a_destOut)
    : sourceIn(a_sourceIn), sourceOut(a_sourceOut), destIn(a_destIn), destOut(a_destOut) {
    if (a_wireFile) {
        wireFile = KLFilePath::TrimHead(a_wireFile, KLStdImp::Workspace().GetWireDirectory());
    }
}

KLEdlEvent::~KLEdlEvent() {
    DeleteEvent(this);
    CloseWire();
}

void KLEdlEvent::DeleteEvent(void* event) {
    KLEdlEvent* e = static_cast<KLEdlEvent*>(event);
    if (!e)
        return;
    e->wireFile.reset();
    e->extra.reset();
}

void KLEdlEvent::OpenWire() {
    if (!wireFile)
        return;
    const char* dir = KLStdImp::Workspace().GetWireDirectory();
    wire = std::make_unique<KLWireSource>(KLFilePath::Join(dir, wireFile->c_str()).c_str());
    dagList.reset();
    if (std::unique_ptr<OrDagNode> root = wire->RootNode())
        dagList = KLWire::BuildDagList(root.get(), 1);
}

int KLEdlEvent::StoreWire(const char* path) {
    if (!wire)
        return 0;
    const int stored = path ? wire->Store(path) : 0;
    CloseWire();
    return stored;
}

void KLEdlEvent::CloseWire() {
    wire.reset();
}

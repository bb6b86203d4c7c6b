#include "model/KLKeySet.h"

#include <cmath>
#include <cstring>
#include <iostream>
#include <limits>

#include "model/FloatText.h"
#include "toolkit/CueRecognizer.h"
#include "toolkit/CueStatement.h"
#include "toolkit/KLFilePath.h"
#include "toolkit/KLImageSGI.h"
#include "toolkit/KLStdImp.h"
#include "toolkit/KLString.h"

namespace {
void copy_name(std::optional<std::string>& to, const char* name) {
    if (name) {
        to = name;
    } else {
        std::cerr << "KLKeySet::KLKeySet() no keyset name given" << std::endl;
    }
}

// A frame as a whole number for a picture name; frames beyond the int range saturate.
int whole_frame(float frame) {
    if (std::isnan(frame))
        return 0;
    if (frame >= 2147483520.0f)
        return std::numeric_limits<int>::max();
    if (frame <= -2147483648.0f)
        return std::numeric_limits<int>::min();
    return int(frame);
}
}  // namespace

KLKeySet::KLKeySet(const char* a_name, const char* a_sourceFile) : kind(1) {
    copy_name(name, a_name);
    if (a_sourceFile)
        sourceFile = a_sourceFile;
}

KLKeySet::KLKeySet(const char* a_name, const char* a_nodeName, int a_channelIndex, float a_lowValue,
                   float a_highValue)
    : kind(2), channelIndex(a_channelIndex), lowValue(a_lowValue), highValue(a_highValue) {
    copy_name(name, a_name);
    if (a_nodeName)
        nodeName = a_nodeName;
}

KLKeySet::~KLKeySet() = default;

void KLKeySet::clear_keyshapes() {
    keyShapes.clear();
    keyShapeCount = 0;
}

int KLKeySet::GetKeyShapeIdx(float frame) const {
    for (const auto& k : keyShapes) {
        if (k->frame == frame)
            return k->index;
    }
    return -1;
}

float KLKeySet::GetKeyShapeFrame(int index) const {
    for (const auto& k : keyShapes) {
        if (k->index == index)
            return k->frame;
    }
    return -1.0f;
}

int KLKeySet::GetKeyShapeId(const char* a_name) const {
    if (!a_name)
        return -1;
    for (int i = 0; i < keyShapeCount; ++i) {
        const char* n = keyShapes[i]->Name();
        if (n && std::strcmp(n, a_name) == 0)
            return i;
    }
    return -1;
}

KLKey* KLKeySet::GetKeyShape(int i) const {
    return (i < 0 || i >= keyShapeCount) ? nullptr : keyShapes[i].get();
}

KLImageSGI* KLKeySet::GetKeyShapeImage(int i) const {
    KLKey* k = GetKeyShape(i);
    return k ? k->GetImage() : nullptr;
}

KLImageSGI* KLKeySet::GetKeyShapeIcon(int i) const {
    KLKey* k = GetKeyShape(i);
    return k ? k->GetIcon() : nullptr;
}

const char* KLKeySet::GetKeyShapeName(int i) const {
    KLKey* k = GetKeyShape(i);
    return k ? k->Name() : nullptr;
}

// Callers make sure the keyset has key shapes; an empty one gives null rather than reading
// past the table.
KLKey* KLKeySet::GetDefaultKeyShape() const {
    return GetKeyShape(defaultIndex);
}

CueRecognizer* KLKeySet::GetRecognizer(const char* a_name) const {
    if (!a_name)
        return nullptr;
    for (const auto& r : recognizers) {
        if (std::strcmp(r->Name(), a_name) == 0)
            return r.get();
    }
    return nullptr;
}

CueRecognizer* KLKeySet::AddRecognizer(std::unique_ptr<CueRecognizer> recognizer) {
    recognizers.push_front(std::move(recognizer));
    return recognizers.front().get();
}

KLKeyChannel* KLKeySet::GetKeyChannel(const char* a_name, int channel) const {
    if (!a_name)
        return nullptr;
    for (const auto& c : keyChannels) {
        const char* n = c->Name();
        if (n && c->channel == channel && std::strcmp(n, a_name) == 0)
            return c.get();
    }
    return nullptr;
}

KLKeyChannel* KLKeySet::AddKeyChannel(std::unique_ptr<KLKeyChannel> channel) {
    keyChannels.push_front(std::move(channel));
    return keyChannels.front().get();
}

// Keyset block, one statement per line, up to a line whose first token is "end":
//   key <name> <frame> <image>   a key shape with a picture; the picture is kept only when the
//                                file (relative names below the picture directory) is readable
//   key <name> <frame>           a key shape without a picture
// Any other statement, a "key" line of another length included, is skipped silently. Frames
// are read as whole numbers, except by a kind-2 keyset for a key shape with no readable
// picture, which takes the number as written.
void KLKeySet::Read(std::istream& in) {
    clear_keyshapes();
    read_block(in);
}

void KLKeySet::read_block(std::istream& in) {
    const char* pixDir = KLStdImp::Workspace().GetPixDirectory();
    std::vector<std::unique_ptr<KLKey>> made;
    CueStatement st;
    while (st.Read(in)) {
        const int n = st.Count();
        if (n >= 1 && st.Matches("end"))
            break;
        if ((n != 3 && n != 4) || !st.Matches("key") || (kind != 1 && kind != 2))
            continue;
        std::unique_ptr<KLKey> key;
        bool readable = false;
        if (n == 4) {
            const std::string path = KLFilePath::Join(pixDir, st.ArgText(3));
            readable = KLFilePath::Exists(path.c_str()) && KLFilePath::IsReadable(path.c_str());
        }
        if (readable) {
            key = std::make_unique<KLKey>(float(st.ArgInt(2)), st.ArgText(1), st.ArgText(3));
        } else {
            const float frame = kind == 2 ? st.ArgFloat(2) : float(st.ArgInt(2));
            key = std::make_unique<KLKey>(frame, st.ArgText(1), nullptr);
            imagesOnFile = 0;
        }
        key->index = int(made.size());
        made.push_back(std::move(key));
    }
    keyShapes = std::move(made);
    keyShapeCount = int(keyShapes.size());
    if (kind == 1 && keyShapeCount > 0) {
        const float restFrame = KLStdImp::Workspace().DefaultKeyFrame();
        for (int i = 0; i < keyShapeCount; ++i) {
            if (keyShapes[i]->frame == restFrame)
                defaultIndex = i;
        }
    }
    // No key shape at the rest frame: keep the old default while it still names a key shape.
    if (defaultIndex < 0 || (keyShapeCount > 0 && defaultIndex >= keyShapeCount))
        defaultIndex = 0;
}

std::string KLKeySet::picture_path(int i, const char* pixDir) const {
    const int number = kind == 1 ? whole_frame(keyShapes[i]->frame) : i;
    const std::string file = KLFmt("%s.%04d.sgi", Name() ? Name() : "", number);
    return KLFilePath::Join(pixDir, file.c_str());
}

// Writes "    key <name> <frame> <picture>" per key shape, names quoted when they hold a blank
// or a tab. While the pictures read are all on file and unchanged, the picture names are
// written as read; otherwise every key shape's picture is stored anew as
// <pixdir>/<keyset>.<frame or index, 4 digits>.sgi so that the block names existing files.
// The picture directory is trimmed from the names written.
void KLKeySet::Write(std::ostream& out) {
    const char* pixDir = KLStdImp::Workspace().GetPixDirectory();
    const bool keepNames = imagesChanged == 0 && imagesOnFile != 0;
    for (int i = 0; i < keyShapeCount; ++i) {
        KLKey* key = keyShapes[i].get();
        const std::string path = (keepNames && key->ImageFile()) ? std::string(key->ImageFile())
                                                                 : picture_path(i, pixDir);
        out << "    key " << KLQuote(key->Name()) << " " << FloatText(key->frame) << " "
            << KLQuote(KLFilePath::TrimHead(path.c_str(), pixDir)) << std::endl;
        if (!keepNames) {
            KLImageSGI* picture = key->GetImage();
            std::string error;
            if (picture && !picture->Store(path.c_str(), &error)) {
                std::cerr << "KLKeySet::Write() " << error << std::endl;
            }
        }
    }
}

// Imp: reference and playblast image sequences.
//
// A sequence is a run of numbered image files "PREFIX.NUMBER[.EXT]" (NUMBER possibly
// zero-padded to a fixed width) loaded into memory, resized to the zoom level's size, and
// shown from an offset on the time line: frame i of the sequence (0-based) is shown from
// offset + i frames up to offset + i + 1 frames at the workspace rate.
#include <unistd.h>

#include <algorithm>
#include <cctype>

#include "toolkit/KLErrHandler.h"
#include "toolkit/KLFilePath.h"
#include "toolkit/KLImageSGI.h"
#include "toolkit/KLString.h"
#include "workspace/Ghost.h"
#include "workspace/Imp.h"

namespace {

// Frame numbers are searched below this limit only; the limit itself is never used.
constexpr int kFrameLimit = 9999;

// The fields of one of the two sequences, so that both load the same way.
struct Sequence {
    const char* kind;  // "reference" or "playblast", for messages
    std::unique_ptr<std::unique_ptr<KLImageSGI>[]>& images;
    int& count;
    int& loaded;
    CueTime& offset;
    void (Imp::*setOffset)(CueTime);
};

Sequence reference_of(Imp& imp) {
    return {"reference",         imp.referenceImages, imp.referenceCount,
            imp.referenceLoaded, imp.referenceOffset, &Imp::SetReferenceOffset};
}

Sequence playblast_of(Imp& imp) {
    return {"playblast",         imp.playblastImages, imp.playblastCount,
            imp.playblastLoaded, imp.playblastOffset, &Imp::SetPlayblastOffset};
}

bool all_digits(const std::string& s) {
    for (const char c : s)
        if (!std::isdigit(static_cast<unsigned char>(c)))
            return false;
    return true;
}

// The parts of an image file name. `width` 0 means the number is written without padding.
struct FrameName {
    std::string prefix;
    std::string ext;  // empty: no extension
    int number = 0;
    int width = 0;
};

// Splits `name` into prefix, number and extension. Only points in the last path component
// separate parts: "shots/take.2/face" is a prefix with neither number nor extension.
FrameName split_frame_name(const std::string& name) {
    FrameName f;
    const size_t base = name.rfind('/') == std::string::npos ? 0 : name.rfind('/') + 1;
    auto last_point = [&](const std::string& s) {
        const size_t p = s.rfind('.');
        return p == std::string::npos || p < base ? std::string::npos : p;
    };
    std::string numberText;
    bool hasNumber = false;
    size_t p = last_point(name);
    if (p == std::string::npos) {
        f.prefix = name;
    } else if (all_digits(name.substr(p + 1))) {
        numberText = name.substr(p + 1);
        hasNumber = true;
        f.prefix = name.substr(0, p);
    } else {
        f.ext = name.substr(p + 1);
        const std::string rest = name.substr(0, p);
        p = last_point(rest);
        if (p != std::string::npos && all_digits(rest.substr(p + 1))) {
            numberText = rest.substr(p + 1);
            hasNumber = true;
            f.prefix = rest.substr(0, p);
        } else {
            f.prefix = rest;
        }
    }
    if (hasNumber) {
        // Leading zeros are padding; a value past the search limit finds nothing anyway.
        for (const char c : numberText)
            f.number = std::min(f.number * 10 + (c - '0'), kFrameLimit);
        f.width = numberText == "0" ? 0 : int(numberText.size());
    }
    return f;
}

// "%s.%d.%s", "%s.%d", or the same with the number zero-padded to `width`.
std::string frame_file(const std::string& prefix, const std::string& ext, int width, int n) {
    if (ext.empty())
        return KLFmt("%s.%0*d", prefix.c_str(), width, n);
    return KLFmt("%s.%0*d.%s", prefix.c_str(), width, n, ext.c_str());
}

bool readable(const std::string& path) {
    return access(path.c_str(), R_OK) == 0;
}

// The picture size of a zoom level; any level but 1, 2 and 3 becomes 4.
void zoom_size(int* zoom, int* width, int* height) {
    switch (*zoom) {
        case 1:
            *width = 320, *height = 242;
            break;
        case 2:
            *width = 160, *height = 121;
            break;
        case 3:
            *width = 106, *height = 80;
            break;
        default:
            *zoom = 4, *width = 80, *height = 60;
            break;
    }
}

// Takes back a string of the dialog (a new[] array, possibly replaced by the dialog) and
// frees it.
std::string take_string(char*& s) {
    std::string value = s ? s : "";
    delete[] s;
    s = nullptr;
    return value;
}

// LoadReference and LoadPlayblast. The dialog gets the prefix and extension as new[] arrays
// (KLNewString; the extension is "" when there is none); it may replace either by deleting it
// and storing a new KLNewString, and the strings are freed here afterwards. The frame range
// it returns is clamped to [0, 9998]; an empty range loads nothing and keeps the sequence
// held before.
int load_sequence(Imp& imp, Sequence seq, const char* name) {
    if (!name || !*name)
        return 0;
    KLStatus("Computing available frame range...");
    const FrameName f = split_frame_name(KLFilePath::Join(imp.GetPixDirectory(), name));

    int start = f.number;
    while (start < kFrameLimit && !readable(frame_file(f.prefix, f.ext, f.width, start)))
        ++start;
    if (start >= kFrameLimit) {
        theGhost->Inform(KLFmt("Failed to find any %s frames.", seq.kind).c_str(), "Dismiss");
        seq.loaded = 0;
        return 0;
    }
    int end = start;
    while (end + 1 < kFrameLimit && readable(frame_file(f.prefix, f.ext, f.width, end + 1)))
        ++end;

    char* prefix = KLNewString(f.prefix.c_str());
    char* ext = KLNewString(f.ext.c_str());
    int by = 1;  // shown in the dialog; frames are always loaded one by one
    int zoom = imp.referenceZoom;
    const int ok = theGhost->AdjustRelLoad(&prefix, &ext, &start, &end, &by, &zoom);
    const std::string newPrefix = take_string(prefix);
    const std::string newExt = take_string(ext);
    if (!ok)
        return 1;

    int width = 0, height = 0;
    zoom_size(&zoom, &width, &height);
    imp.referenceZoom = zoom;
    if (start < 0)
        start = 0;
    if (end >= kFrameLimit)
        end = kFrameLimit - 1;
    if (end < start)
        return 1;

    (imp.*seq.setOffset)(CueTime(double(start), 0));
    const int count = end - start + 1;
    auto images = std::make_unique<std::unique_ptr<KLImageSGI>[]>(size_t(count));
    for (int n = start; n <= end; ++n) {
        const std::string file = frame_file(newPrefix, newExt, f.width, n);
        std::string error;
        std::unique_ptr<KLImageSGI> image = KLImageSGI::Load(file.c_str(), &error);
        if (image)
            image->Resize(width, height);
        else
            KLInform("%s\n", error.c_str());  // the slot stays empty
        images[size_t(n - start)] = std::move(image);
        KLStatus("Loading [%s] from [%d] to [%d] ...", file.c_str(), start, end);
    }
    seq.images = std::move(images);
    seq.count = count;
    seq.loaded = 1;
    return 1;
}

void delete_sequence(Imp& imp, Sequence seq) {
    (imp.*seq.setOffset)(CueTime());
    seq.images.reset();
    seq.count = 0;
    seq.loaded = 0;
}

// The frame shown at `t`: whole frames of (t - offset) at the workspace rate, truncated
// toward zero; null outside [0, count) or for a frame that failed to load.
KLImageSGI* image_at(const Sequence& seq, CueTime t) {
    if (!seq.loaded || !seq.images)
        return nullptr;
    const int i = (t - seq.offset).Frame();
    if (i < 0 || i >= seq.count)
        return nullptr;
    return seq.images[size_t(i)].get();
}

// The time just after the last frame: offset + count frames.
CueTime end_of(const Sequence& seq) {
    return CueTime(seq.offset.Frames() + seq.count, 0);
}

}  // namespace

int Imp::LoadReference(const char* name) {
    return load_sequence(*this, reference_of(*this), name);
}

int Imp::LoadPlayblast(const char* name) {
    return load_sequence(*this, playblast_of(*this), name);
}

void Imp::DeleteReference() {
    delete_sequence(*this, reference_of(*this));
}

void Imp::DeletePlayblast() {
    delete_sequence(*this, playblast_of(*this));
}

CueTime Imp::ReferenceEnd() {
    return end_of(reference_of(*this));
}

CueTime Imp::PlayblastEnd() {
    return end_of(playblast_of(*this));
}

KLImageSGI* Imp::GetReference(CueTime t) {
    return image_at(reference_of(*this), t);
}

KLImageSGI* Imp::GetPlayblast(CueTime t) {
    return image_at(playblast_of(*this), t);
}

// Imp: the keyset description file (load, save, verification) and reading its scene file.
#include <cmath>
#include <cstdlib>
#include <cstring>
#include <fstream>
#include <iostream>
#include <vector>

#include "model/KLKeySet.h"
#include "model/KLKeyTrack.h"
#include "model/KLMarkTrack.h"
#include "scene/KLGraphNode.h"
#include "scene/KLKeyFrameList.h"
#include "scene/KLScene.h"
#include "scene/KLWire.h"
#include "scene/KLWireSource.h"
#include "scene/OrDagNode.h"
#include "toolkit/CuePrefs.h"
#include "toolkit/CueRecognizer.h"
#include "toolkit/CueSound.h"
#include "toolkit/CueStatement.h"
#include "toolkit/KLErrHandler.h"
#include "toolkit/KLFilePath.h"
#include "toolkit/KLString.h"
#include "workspace/Ghost.h"
#include "workspace/Imp.h"
#include "workspace/SafeFile.h"

namespace {

// The canonical form of a directory, so that "a/../b" and "b" compare equal; the name as it
// stands when it cannot be resolved.
std::string canonical_dir(const std::string& dir) {
    char* real = ::realpath(dir.c_str(), nullptr);
    if (!real)
        return dir;
    std::string result(real);
    std::free(real);
    return result;
}

}  // namespace

void Imp::parse_keyset_file(std::istream& in) {
    CueStatement s;
    while (s.Read(in)) {
        const int n = s.Count();
        if (s.Matches("wire", 0) && (n == 2 || n == 3)) {
            wireFile = s.ArgText(1);
            wireFrame = n == 3 ? s.ArgFloat(2) : 0.0f;
        } else if (s.Matches("begin", 0) && s.Matches("keyset", 1) && (n == 3 || n == 4)) {
            if (keysetCount < kMaxKeysets) {
                parse_keyset(s, in);
            } else {
                KLWarning("Maximum keysets [%d] reached.", kMaxKeysets);
                KLEatBeginEndBlock(in);
            }
        } else if (s.Matches("begin", 0) && s.Matches("shapeset", 1) && (n == 5 || n == 7)) {
            if (keysetCount < kMaxKeysets) {
                parse_shapeset(s, in);
            } else {
                KLWarning("Maximum keysets [%d] reached.", kMaxKeysets);
                KLEatBeginEndBlock(in);
            }
        } else if (s.Matches("begin", 0) && s.Matches("recognizer", 1) && n == 4) {
            parse_recog(in, s.ArgText(2), s.ArgText(3));
        } else if (s.Matches("begin", 0) && s.Matches("recognizer-links", 1) && n == 4) {
            parse_recog_links(in, s.ArgText(2), s.ArgText(3));
        }
    }
}

void Imp::parse_keyset(CueStatement& s, std::istream& in) {
    auto keyset = std::make_unique<KLKeySet>(s.ArgText(2), s.Count() == 4 ? s.ArgText(3) : nullptr);
    keyset->Read(in);
    keyset->keyFrameList = keyFrames.get();
    keyTracks[keysetCount] = std::make_unique<KLKeyTrack>(keyset.get());
    keySets[keysetCount] = std::move(keyset);
    ++keysetCount;
}

void Imp::parse_shapeset(CueStatement& s, std::istream& in) {
    const bool ranged = s.Count() == 7;
    auto keyset =
        std::make_unique<KLKeySet>(s.ArgText(2), s.ArgText(3), s.ArgInt(4),
                                   ranged ? s.ArgFloat(5) : 0.0f, ranged ? s.ArgFloat(6) : 1.0f);
    keyset->Read(in);
    keyset->keyFrameList = keyFrames.get();
    keyTracks[keysetCount] = std::make_unique<KLKeyTrack>(keyset.get());
    keySets[keysetCount] = std::move(keyset);
    ++keysetCount;
}

void Imp::parse_recog(std::istream& in, const char* recognizer, const char* keyset) {
    KLKeySet* set = GetKeySet(keyset);
    if (!set) {
        report(KLFmt("Failed to find key set [%s].", keyset));
        return;  // the block is left to the top level, which skips its lines
    }
    CueRecognizer* r = set->GetRecognizer(recognizer);
    const bool fetched = r == nullptr;
    if (fetched)
        r = recognizers.FetchRecognizer(recognizer);
    if (!r) {
        report(KLFmt("Failed to find recognizer plugin [%s].", recognizer));
        return;
    }
    r->GuardedReadSettings(in);
    // A recognizer the keyset already holds is read again in place, not listed twice.
    if (fetched)
        set->AddRecognizer(r);
}

void Imp::parse_recog_links(std::istream& in, const char* recognizer, const char* keyset) {
    KLKeySet* set = GetKeySet(keyset);
    if (!set) {
        report(KLFmt("Failed to find keyset [%s].", keyset));
        return;
    }
    CueRecognizer* r = set->GetRecognizer(recognizer);
    if (!r) {
        report(KLFmt("Failed to find recognizer [%s].", recognizer));
        return;
    }
    CueStatement s;
    while (s.Read(in)) {
        if (s.Matches("end", 0))
            break;
        if (!s.Matches("link", 0) || s.Count() != 4)
            continue;
        CueRecognizer::Target* target = r->FindTarget(s.ArgText(1));
        if (!target) {
            report(
                KLFmt("Failed to find target [%s] for recognizer [%s].", s.ArgText(1), r->Name()));
            continue;
        }
        const int key = set->GetKeyShapeId(s.ArgText(3));
        if (key == -1) {
            report(KLFmt("Failed to find key [%s] for recognizer [%s].", s.ArgText(3), r->Name()));
            continue;
        }
        target->keyShapeIndex = key;
    }
}

int Imp::read_wire_file(const char* name) {
    const std::string path = KLFilePath::Join(GetWireDirectory(), name);
    auto source = std::make_unique<KLWireSource>(path.c_str());
    if (!source->Valid()) {
        KLError("%s\n", source->ErrorText().c_str());
        return 0;
    }
    wireSource = std::move(source);
    std::unique_ptr<OrDagNode> root(wireSource->RootNode());
    KLWire::NukeBlendSurfaces(root.get());

    // The scene frames of the key shapes of all frame keysets, in keyset and key-shape order;
    // each key shape learns its place in that list.
    std::vector<int> frames;
    for (int i = 0; i < keysetCount; ++i) {
        KLKeySet* set = keySets[i].get();
        if (set->kind != 1)
            continue;
        for (auto& key : set->keyShapes) {
            key->shapeValue = int(frames.size());
            frames.push_back(int(std::lround(key->frame)));
        }
        KLInform("KEYSET %s.\n", set->Name());
        if (set->sourceFile) {
            std::unique_ptr<OrDagNode> node(
                KLWire::FetchDagNode(root.get(), set->sourceFile->c_str()));
            if (node)
                set->ExtractKeys(node.get());
            else
                KLWarning("Keyset [%s]: no node [%s] in the wire file, no key channels.\n",
                          set->Name(), set->sourceFile->c_str());
        } else {
            set->ExtractKeys(root.get());
        }
    }
    keyFrames = std::make_unique<KLKeyFrameList>(std::move(frames), int(std::lround(wireFrame)));
    for (int i = 0; i < keysetCount; ++i)
        keySets[i]->keyFrameList = keyFrames.get();
    return 1;
}

int Imp::LoadKeyset(const char* name) {
    std::ifstream in(name ? name : "");
    if (!name || !in || KLFilePath::IsDirectory(name)) {
        report(KLFmt("Failed to open keyset file [%s].", name ? name : ""));
        return 0;
    }
    batchStop = 0;

    if (!batchMode) {
        // A description outside the data directory may belong to another project.
        const std::string dir = KLFilePath::Directory(name);
        const char* misc = GetDataDirectory();
        if (!misc || canonical_dir(dir) != canonical_dir(misc)) {
            const std::string last = KLFilePath::Basename(canonical_dir(dir).c_str());
            const char* miscName = CuePrefs::Variable("TESSEL_MISC_DIR");
            if ((miscName && last == miscName) || last == "misc_data") {
                const std::string project = KLFilePath::Directory(canonical_dir(dir).c_str());
                if (theGhost->Confirm(
                        KLFmt("Change TESSEL_PROJECT to [%s]?", project.c_str()).c_str(), "Change",
                        "Don't Change")) {
                    CuePrefs::SetProject(project.c_str());
                    theGhost->ResetFileManagers();
                }
            } else {
                theGhost->Inform("Can't determine new TESSEL_PROJECT, unchanged", "OK");
            }
        }
    }

    geometryActive = loadGeometry;
    activeKeyset = 0;
    if (!batchMode)
        KLStatus("Deleting old keysets.");
    // Batch mode clears too (without a word), so that a second load never adds to the first.
    clear_keyset_data();
    if (!batchMode)
        KLStatus("Parsing keyset description.");
    parse_keyset_file(in);

    if (wireFile.empty()) {
        if (batchMode) {
            std::cerr << "No wire file!" << std::endl;
            batchStop = 1;
        } else {
            theGhost->Inform("Could not read wire file, cannot load keyset", "Dismiss");
        }
        clear_keyset_data();
        return 0;
    }
    const std::string wirePath = KLFilePath::Join(GetWireDirectory(), wireFile.c_str());
    const std::string written = wireFile;
    bool readable = KLFilePath::Exists(wirePath.c_str()) &&
                    KLFilePath::IsReadable(wirePath.c_str()) &&
                    KLWire::IsWireFile(wirePath.c_str());
    if (readable) {
        KLStatus("Reading wire file [%s].", written.c_str());
        readable = read_wire_file(written.c_str());
    }
    if (!readable) {
        if (batchMode) {
            std::cerr << "Could not read wire file " << wirePath << ", cannot load keyset"
                      << std::endl;
            batchStop = 1;
        } else {
            theGhost->Inform("Could not read wire file, cannot load keyset", "Dismiss");
        }
        clear_keyset_data();
        return 0;
    }

    if (!batchMode) {
        for (int i = 0; i < keysetCount; ++i)
            theGhost->InitKeyset(i);
        theGhost->DressKeysetMenu();
        theGhost->InitSound(sound.get());
        theGhost->InitMarkTrack(markTrack.get());
        if (geometryActive) {
            scene->LoadGeometry(wireSource.get());
            scene->SetRestFrame(wireFrame);
            scene->SetDetail(tessU, tessV);
            scene->Feedback(feedback, nullptr);
            for (int i = 0; i < keysetCount; ++i) {
                KLKeySet* set = keySets[i].get();
                if (set->kind != 2 || !set->nodeName)
                    continue;
                if (KLGraphNode* node = scene->FetchNode(set->nodeName->c_str()))
                    keyTracks[i]->SetControlGraphNode(node);
                else
                    std::cerr << "Couldn't find keyset node " << *set->nodeName << std::endl;
            }
        }
        theGhost->SetActiveKeyset(activeKeyset);
        theGhost->CenterKeyView();
        theGhost->CenterMixView();
    }
    keysetModified = 0;
    if (!batchMode) {
        theGhost->MakeKeysetImages();
        PrepareKeyFrames(-1);
        theGhost->SetMenuStatus();
        theGhost->SetViewStatus();
    }

    if (!VerifyKeysets()) {
        const char* text = "Keyset verification revealed some problems.";
        if (batchMode) {
            std::cerr << text << std::endl;
        } else {
            KLError("%s\n", text);
            if (theGhost->Confirm(text, "View Error Log", "Dismiss"))
                ViewErrorLog();
        }
    }
    return 1;
}

int Imp::VerifyKeysets() {
    KLInform("Verifying keysets ...\n");
    bool clean = true;
    // Every ordered pair of keysets: a clash is reported once from each side.
    for (int i = 0; i < keysetCount; ++i) {
        KLKeySet* a = keySets[i].get();
        for (KLKeyChannel* ca : a->keyChannels) {
            for (int j = 0; j < keysetCount; ++j) {
                if (j == i)
                    continue;
                KLKeySet* b = keySets[j].get();
                for (KLKeyChannel* cb : b->keyChannels) {
                    if (ca->channel != cb->channel || !ca->name || !cb->name ||
                        *ca->name != *cb->name)
                        continue;
                    KLError("Dag [%s] channel [%s] is found in keysets [%s] and [%s]\n", ca->Name(),
                            ca->GetChannelName(), a->Name(), b->Name());
                    clean = false;
                }
            }
        }
    }
    if (clean)
        KLInform("Keysets are OK.\n");
    return clean ? 1 : 0;
}

void Imp::clear_keyset_data() {
    theGhost->ClearKeysetMenu();
    theGhost->ClearViews();
    theGhost->ClearKeyTracks();
    for (int i = 0; i < kMaxKeysets; ++i) {
        if (i < keysetCount)
            theGhost->ClearKeysets(i);
        keyTracks[i].reset();  // a track refers to its keyset: it goes first
        keySets[i].reset();
    }
    keysetCount = 0;
    markTrack = std::make_unique<KLMarkTrack>();
    scene = make_scene(false);
    wireSource.reset();
    wireFile.clear();
    KLWire::EmptyDumpster();
    KLWire::ClearAll();
    keyFrames.reset();
}

int Imp::SaveKeyset(const char* name) {
    SafeFile file(name ? name : "");
    if (!file.IsOpen())
        return 0;
    std::ostream& out = file.Stream();

    out << "wire " << KLFilePath::TrimHead(wireFile.c_str(), GetWireDirectory()) << " " << wireFrame
        << "\n\n";
    for (int i = 0; i < keysetCount; ++i) {
        KLKeySet* set = keySets[i].get();
        const std::string setName = KLQuote(set->Name());
        if (set->kind == 2) {
            out << "begin shapeset " << setName << " "
                << KLQuote(set->nodeName ? set->nodeName->c_str() : "") << " " << set->channelIndex
                << " " << set->lowValue << " " << set->highValue << "\n";
            set->Write(out);
            out << "end\n\n";
            continue;
        }
        out << "begin keyset " << setName << "\n";
        set->Write(out);
        out << "end\n\n";
        // Oldest first, so that reading the file back (each one put first) keeps the order.
        for (auto it = set->recognizers.rbegin(); it != set->recognizers.rend(); ++it) {
            CueRecognizer* r = *it;
            const std::string rName = KLQuote(r->Name());
            out << "begin recognizer " << rName << " " << setName << "\n";
            r->GuardedWriteSettings(out);
            out << "end\n\n";
            out << "begin recognizer-links " << rName << " " << setName << "\n";
            for (const CueRecognizer::Target& target : r->targets) {
                if (target.keyShapeIndex == -1)
                    continue;
                out << "    link " << KLQuote(target.name) << " to "
                    << KLQuote(set->GetKeyShapeName(target.keyShapeIndex)) << "\n";
            }
            out << "end\n\n";
        }
    }
    if (!file.Commit())
        return 0;
    keysetModified = 0;
    return 1;
}

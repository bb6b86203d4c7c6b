#include "toolkit/CueRecognizer.h"

#include <exception>
#include <istream>
#include <ostream>

#include "toolkit/CuePrefs.h"
#include "toolkit/CueStatement.h"
#include "toolkit/KLErrHandler.h"
#include "toolkit/KLFilePath.h"
#include "toolkit/KLString.h"

namespace {

// Runs `call` (which reaches plug-in code) and reports an exception instead of passing it on;
// false when one was thrown.
template <typename Call>
bool guard(const CueRecognizer& recognizer, Call&& call) {
    try {
        call();
        return true;
    } catch (const std::exception& e) {
        KLWarning("Recognizer [%s] failed: %s\n", recognizer.Name(), e.what());
    } catch (...) {
        KLWarning("Recognizer [%s] failed: unknown exception\n", recognizer.Name());
    }
    return false;
}

}  // namespace

CueRecognizer::CueRecognizer(std::string name) : name_(std::move(name)) {}

CueRecognizer::~CueRecognizer() = default;

CueRecognizer::Target* CueRecognizer::FindTarget(const char* name) {
    const int i = TargetIndex(name);
    return i < 0 ? nullptr : &targets[size_t(i)];
}

int CueRecognizer::TargetIndex(const char* name) const {
    if (!name)
        return -1;
    for (size_t i = 0; i < targets.size(); ++i)
        if (targets[i].name == name)
            return int(i);
    return -1;
}

int CueRecognizer::AddTarget(const char* name) {
    const int found = TargetIndex(name);
    if (found >= 0)
        return found;
    Target t;
    t.name = name ? name : "";
    targets.push_back(std::move(t));
    return int(targets.size()) - 1;
}

bool CueRecognizer::Configured() const {
    if (targets.empty())
        return false;
    for (const Target& t : targets)
        if (t.keyShapeIndex < 0)
            return false;
    return true;
}

void CueRecognizer::ResetSettings() {
    step = defaultStep;
    for (Target& t : targets) {
        t.pictureFile.clear();
        t.soundFile.clear();
    }
}

bool CueRecognizer::ReadSettings(std::istream& in) {
    CueStatement s;
    while (s.Read(in)) {
        if (s.Matches("end"))
            return true;
        if (s.Matches("begin")) {
            KLEatBeginEndBlock(in);
        } else if (s.Matches("step")) {
            // A step that is not a positive time is ignored: a zero step would never advance.
            CueTime t;
            if (s.Count() == 2 && t.SetText(s.ArgText(1)) && t > CueTime())
                step = t;
        } else if (s.Matches("target")) {
            read_target(s);
        } else if (s.Count() > 0) {
            ReadParameter(s);
        }
    }
    return false;
}

// "target NAME [picture FILE] [sound FILE]": the keyword pairs may come in any order; a
// keyword without its file, or an unknown keyword, ends the line's reading.
void CueRecognizer::read_target(const CueTokenList& s) {
    Target* t = s.Count() >= 2 ? FindTarget(s.ArgText(1)) : nullptr;
    if (!t)
        return;
    for (int i = 2; i + 1 < s.Count(); i += 2) {
        if (s.Matches("picture", i))
            t->pictureFile = s.ArgText(i + 1);
        else if (s.Matches("sound", i))
            t->soundFile = s.ArgText(i + 1);
        else
            break;
    }
}

void CueRecognizer::WriteSettings(std::ostream& out) const {
    out << "    step " << step.Text() << "\n";
    for (const Target& t : targets) {
        out << "    target " << KLQuote(t.name);
        if (!t.pictureFile.empty())
            out << " picture " << KLQuote(t.pictureFile);
        if (!t.soundFile.empty())
            out << " sound " << KLQuote(t.soundFile);
        out << "\n";
    }
    WriteParameters(out);
}

void CueRecognizer::ReadParameter(const CueTokenList&) {}

void CueRecognizer::WriteParameters(std::ostream&) const {}

bool CueRecognizer::GuardedReadSettings(std::istream& in) {
    bool ok = false;
    return guard(*this, [&] { ok = ReadSettings(in); }) && ok;
}

bool CueRecognizer::GuardedWriteSettings(std::ostream& out) const {
    return guard(*this, [&] { WriteSettings(out); });
}

bool CueRecognizer::GuardedResetSettings() {
    return guard(*this, [&] { ResetSettings(); });
}

bool CueRecognizer::GuardedRecognize(const CueSound& sound) {
    bool ok = false;
    if (guard(*this, [&] { ok = Recognize(sound); }) && ok)
        return true;
    results.clear();
    return false;
}

std::unique_ptr<CueRecognizer> CueRecognizer::GuardedClone() const {
    std::unique_ptr<CueRecognizer> copy;
    guard(*this, [&] { copy.reset(Clone()); });
    return copy;
}

std::string CueRecognizer::ConfigFileName() const {
    const char* dir = CuePrefs::MiscDir();
    return KLFilePath::Join(dir ? dir : ".", KLFmt("%s.config", Name()).c_str());
}

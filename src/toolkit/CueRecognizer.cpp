#include "toolkit/CueRecognizer.h"

#include "toolkit/CueStatement.h"

CueRecognizer::CueRecognizer(std::string name) : name_(std::move(name)) {}

CueRecognizer::~CueRecognizer() = default;

CueRecognizer::Target* CueRecognizer::FindTarget(const char* name) {
    if (!name) return nullptr;
    for (Target& t : targets)
        if (t.name == name) return &t;
    return nullptr;
}

bool CueRecognizer::Configured() const {
    if (targets.empty()) return false;
    for (const Target& t : targets)
        if (t.keyShapeIndex < 0) return false;
    return true;
}

bool CueRecognizer::ReadSettings(std::istream& in) {
    KLEatBeginEndBlock(in);
    return true;
}

void CueRecognizer::WriteSettings(std::ostream&) const {}

#include "phoneme/PhoneSet.h"

#include <cstring>

namespace {
const char* const kNames[PhoneSet::kCount] = {
    "AA", "AE", "AH", "AO", "AW", "AY", "B", "CH", "D", "DH", "EH", "ER", "EY", "F",
    "G",  "HH", "IH", "IY", "JH", "K",  "L", "M",  "N", "NG", "OW", "OY", "P",  "R",
    "S",  "SH", "T",  "TH", "UH", "UW", "V", "W",  "Y", "Z",  "ZH", "SIL"};
}

const char* PhoneSet::Name(int index) {
    return index >= 0 && index < kCount ? kNames[index] : kNames[kSilence];
}

int PhoneSet::IndexOf(const char* phone) {
    if (phone)
        for (int i = 0; i < kCount; ++i)
            if (std::strcmp(phone, kNames[i]) == 0)
                return i;
    return kSilence;
}

#include "scene/KLWireSetting.h"

#include "scene/KLWire.h"

KLWireSetting::KLWireSetting(Which which) : which_(which) {
    if (which_ == kDemangleNames) {
        before_ = KLWire::NamesDemangled();
        KLWire::DemangleNames(1);
    } else {
        before_ = KLWire::alwaysClearChannel;
        KLWire::alwaysClearChannel = 1;
    }
}

KLWireSetting::~KLWireSetting() {
    if (which_ == kDemangleNames)
        KLWire::DemangleNames(before_);
    else
        KLWire::alwaysClearChannel = before_;
}

#include "scene/KLTransform.h"

KLChannel* KLTransform::AnimateChannel(int c) {
    if (c < 0 || c >= 9) {
        return nullptr;
    }
    if (!channels_[c]) {
        channels_[c] = std::make_unique<KLChannel>();
        channels_[c]->SetStorageKeyed();
    }
    return channels_[c].get();
}

KLChannel* KLTransform::Channel(int c) const {
    return c < 0 || c >= 9 ? nullptr : channels_[c].get();
}

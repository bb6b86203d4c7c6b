#include "scene/KLKeyFrameList.h"

#include <algorithm>

void KLKeyFrameList::AddKeyChannel(KLChannel* shapeChannel, KLChannel* valueChannel) {
    channels_.emplace_back(shapeChannel, valueChannel);
}

void KLKeyFrameList::RemoveKeyChannel(KLChannel* channel) {
    if (!channel) {
        return;
    }
    channels_.erase(std::remove_if(channels_.begin(), channels_.end(),
                                   [&](const std::pair<KLChannel*, KLChannel*>& p) {
                                       return p.first == channel || p.second == channel;
                                   }),
                    channels_.end());
}

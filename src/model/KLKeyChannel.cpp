#include "model/KLKeyChannel.h"

#include <iostream>
#include <new>

namespace {
const char* const kChannelNames[] = {"TX", "TY", "TZ", "RX", "RY", "RZ", "SX", "SY", "SZ"};
}

KLKeyChannel::KLKeyChannel(const char* a_name, int a_channel, int a_size)
    : channel(a_channel), size(a_size) {
    if (a_name) {
        name = a_name;
    } else {
        std::cerr << "KLKeyChannel::KLKeyChannel() no name" << std::endl;
    }
    if (a_size == 0)
        std::cerr << "KLKeyChannel::KLKeyChannel() a_size is 0" << std::endl;
    if (a_size >= 0)
        values.reset(new (std::nothrow) float[size_t(a_size)]());
    if (!values)
        std::cerr << "KLKeyChannel::KLKeyChannel() couldn't allocate values" << std::endl;
}

KLKeyChannel::~KLKeyChannel() = default;

const char* KLKeyChannel::GetChannelName() const {
    if (channel >= kTX && channel <= kSZ)
        return kChannelNames[channel];
    std::cerr << "KLKeyChannel::GetChannelName() unknown channel" << std::endl;
    return "TX";
}

void KLKeyChannel::Set(int i, float v) {
    if (i < 0 || i >= size)
        return;
    if (!values) {
        std::cerr << "KLKeyChannel::Set() no values allocated" << std::endl;
        return;
    }
    values[i] = v;
    ++count;
}

float KLKeyChannel::Get(int i) const {
    if (i < 0 || i >= size) {
        std::cerr << "KLKeyChannel::Get() out of range" << std::endl;
        return kOutOfRange;
    }
    if (!values) {
        std::cerr << "KLKeyChannel::Get() no values allocated" << std::endl;
        return 0.0f;
    }
    return values[i];
}

int KLKeyChannel::Constant() const {
    if (count <= 0 || count != size || !values)
        return 1;
    for (int i = 1; i < size; ++i) {
        if (values[i] != values[0])
            return 0;
    }
    return 1;
}

void KLKeyChannel::Dump() const {
    // `count` may exceed `size` when a slot was set twice; only existing slots are printed.
    for (int i = 0; i < count && i < size && values; ++i) {
        std::cerr << "    Idx " << i << " value " << values[i] << std::endl;
    }
}

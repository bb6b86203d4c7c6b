#pragma once

// Switches one of the scene layer's settings on while it lives and back to what it was when
// it goes, however the scope is left (an early return included):
//
//     {
//         KLWireSetting demangle(KLWireSetting::kDemangleNames);
//         node = KLWire::FetchDagNode(base, name);
//     }
class KLWireSetting {
  public:
    enum Which {
        kDemangleNames,       // KLWire::DemangleNames
        kAlwaysClearChannel,  // KLWire::alwaysClearChannel
    };
    explicit KLWireSetting(Which which);
    ~KLWireSetting();
    KLWireSetting(const KLWireSetting&) = delete;
    KLWireSetting& operator=(const KLWireSetting&) = delete;

  private:
    Which which_;
    int before_;
};

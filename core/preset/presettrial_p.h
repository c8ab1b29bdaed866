// A preset tried on an encode pipe of its own.
#pragma once

#include <memory>
#include <string>

class QvEncodePipe;
class QvPreset;

struct PresetTrial {
    std::unique_ptr<QvEncodePipe> pipe;  // null if the preset can't be applied
    std::string failure;                 // then why

    explicit PresetTrial(const QvPreset& preset);
    ~PresetTrial();
};

// Why a user preset can't be used here, as its "#err"; empty if it can.
std::string qvWhyInvalid(const QvPreset& preset);

// The automatic audio chain. Between its first and last stage samples are 32 bits wide.
#pragma once

#include <memory>

class MediaTime;
class QvAProcessPipe;
struct AudioJobDescription;

namespace qvchain {

// As QvProcessUtil::createAudioPipe.
std::unique_ptr<QvAProcessPipe> createAudioPipe(const AudioJobDescription& job, MediaTime& delayOut);

}  // namespace qvchain

#include "tarsel/job/task/joinlevel.h"

#include <algorithm>
#include <memory>
#include <new>

#include "tarsel/job/task/storedtask.h"
#include "tarsel/words/messages.h"

namespace {

constexpr int kBlock = 16384;  // samples that are read at a time
constexpr int kWideBits = 32;  // of samples between filters, which have room above full scale

AnyDict wideOutput(const SoundFormat& format) {
    const std::unique_ptr<QvEncodePipe> pipe(QvEncodePipe::create());
    if (!pipe) throw failure(Msg::outputNoModule, {"the sound to be measured"});
    pipe->clearStreams();
    if (pipe->setMuxer("nullmux") != QvStatus::ok || pipe->addStream(qvAudioStream, Any("rawaenc")) < 0)
        throw failure(Msg::muxerUnusable, {"nullmux", pipe->errorDesc()});
    QvEncoder& encoder = *pipe->encoder(qvAudioStream, 0);
    setChecked(encoder, "samplerate", format.samplerate, "--normalize");
    setChecked(encoder, "channels", format.channels, "--normalize");
    setChecked(encoder, "bitsPerSample", kWideBits, "--normalize");
    AnyDict state;
    pipe->store(state);
    return state;
}

// The filter of a job of one part decides, with the parameters that it would have there.
double gainFor(const QvLoudness& meter, const SoundTarget& target) {
    const auto filter = makeAnyCodec("normalizer", QvModuleType::audioFilter);
    if (filter->restore(normalizerState(target)) != QvStatus::ok)
        throw failure(Msg::filterFailed, {"normalizer", filter->errorDesc()});
    AnyDict report("integratedLoudness", meter.integrated(), "truePeakdB", meter.truePeak(), "samplePeakdB",
                   meter.samplePeak());
    report.set("rmsdB", meter.rms());
    filter->setParam("_streamReport", report);
    if (filter->open() != QvStatus::ok) throw failure(Msg::filterFailed, {"normalizer", filter->errorDesc()});
    return filter->getParam("gain").toDouble();
}

class Measurement {
  public:
    Measurement(QvDecodePipe& decoder, const std::string& name, int sound)
        : decoder_(decoder), name_(name), sound_(std::to_string(sound)) {}

    // False when it was ended.
    bool read(const SoundFormat& format, const std::function<bool(double)>& goesOn) {
        const int begun = meter_.init(format.channels, format.samplerate);
        if (begun == QvStatus::outOfMemory) throw std::bad_alloc();
        if (begun != QvStatus::ok)
            refuse(std::to_string(format.channels) + " channels at " + std::to_string(format.samplerate) +
                   " Hz can't be measured");
        const auto all = static_cast<double>(std::max(decoder_.nrSamples(0), 1LL));
        while (add(decoder_.readSamples(kBlock, 0)))
            if (!goesOn(std::min(static_cast<double>(meter_.samples()) / all, 1.0))) return false;
        return true;
    }
    const QvLoudness& meter() const { return meter_; }

  private:
    [[noreturn]] void refuse(const std::string& why) const {
        throw failure(Msg::loudnessFailed, {name_, sound_, why});
    }

    // Whether there is more.
    bool add(int read) {
        if (read == QvStatus::endOfStream) return false;
        if (read == QvStatus::outOfMemory) throw std::bad_alloc();
        if (read < 0) refuse(*decoder_.errorDesc() ? decoder_.errorDesc() : "it can't be read");
        const QvPcm* const pcm = decoder_.getAudioPtr(0);
        if (!pcm || pcm->samples() < 1) return false;
        const int added = meter_.add(*pcm);
        if (added == QvStatus::outOfMemory) throw std::bad_alloc();
        if (added != QvStatus::ok) refuse("its format changes");
        return true;
    }

    QvDecodePipe& decoder_;
    const std::string& name_;
    const std::string sound_;
    QvLoudness meter_;
};

}  // namespace

JoinLevel::JoinLevel(const Join& join, const SoundTarget& target, std::string name)
    : join_(join), sounds_(join.streams()), target_(target), name_(std::move(name)) {
    std::erase_if(sounds_, [](const PlannedStream& stream) { return stream.isVideo(); });
    for (const PlannedStream& sound : sounds_)
        if (sound.sound.channels > kMostVolumeChannels)
            throw failure(Msg::soundChannels, {"--normalize", name_, std::to_string(sound.sound.channels),
                                               std::to_string(kMostVolumeChannels)});
}

std::optional<std::vector<double>> JoinLevel::gains(const std::function<bool(double)>& goesOn) const {
    std::vector<double> gains;
    for (const PlannedStream& sound : sounds_) {
        StoredTask task(joinedSoundState(join_, sound.number, wideOutput(sound.sound)), name_);
        task.open();
        const auto sources = task.sources();
        Measurement measurement(sources.front()->decoder(), name_, sound.number);
        const auto done = static_cast<double>(gains.size()), all = static_cast<double>(sounds_.size());
        if (!measurement.read(sound.sound, [&](double part) { return goesOn((done + part) / all); }))
            return std::nullopt;
        gains.push_back(gainFor(measurement.meter(), target_));
    }
    return gains;
}

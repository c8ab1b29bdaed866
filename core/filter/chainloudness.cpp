#include <algorithm>
#include <memory>

#include "core/decode/qvdecoder.h"
#include "core/engine/modules/moduletraits_p.h"
#include "core/engine/modules/optionalparam_p.h"
#include "core/engine/modules/params.h"
#include "core/engine/status.h"
#include "core/filter/chainfilters_p.h"
#include "core/filter/chainloudness_p.h"
#include "core/filter/qvprocesspipe.h"
#include "core/measure/qvgeometry.h"
#include "core/media/qvbuffer.h"
#include "core/media/qvloudness.h"

namespace {

using Pipe = std::unique_ptr<QvAProcessPipe>;

constexpr int blockSamples = 4096;

// Some parameters are set by the chain's builder and not stored, so each that can be set and read is taken
// over.
void copyParameters(const QvAudioFilter& from, QvAudioFilter& to) {
    const AnyVector parameters = qvParameters(from);
    for (const Any& parameter : parameters) {
        const AnyDict& row = parameter.asDict();
        if (row.isSet("readOnly") || !row.get("name").isString()) continue;
        const char* name = row.get("name").asString();
        const Any value = from.getParam(name);
        if (!value.isValid()) continue;
        qvSetOptionalParam(to, name, value);  // some rows are only read
    }
}

std::unique_ptr<QvAudioFilter> copyOf(const QvAudioFilter& filter) {
    auto copy = qvchain::newAudioFilter(filter.name());
    if (!copy) return nullptr;
    AnyDict state;
    filter.store(state);
    if (copy->restore(state) != QvStatus::ok) return nullptr;
    copyParameters(filter, *copy);
    return copy;
}

class Measurement {
  public:
    Measurement(const QvAProcessPipe& pipe, int filters, std::span<const AnyDict> reports,
                const QvReadWatch& watch)
        : model_(pipe), filters_(filters), reports_(reports), watch_(watch) {}

    bool add(const qvchain::SoundRange& range) {
        const bool selected = range.decoder->isSelected(qvAudioStream, range.stream);
        if (!selected && range.decoder->select(qvAudioStream, range.stream) != QvStatus::ok)
            return failed("the stream can not be selected");
        const bool done =
            seek(range, range.from) && (filters_ > 0 ? addThroughChain(range) : addPlain(range));
        const bool back = seek(range, 0);
        if (!selected) range.decoder->deselect(qvAudioStream, range.stream);
        return done && back;
    }
    void levels(AnyDict& to) const {
        to.set("integratedLoudness", meter_.integrated());
        to.set("loudnessRange", meter_.range());
        to.set("truePeakdB", meter_.truePeak());
        to.set("samplePeakdB", meter_.samplePeak());
        to.set("rmsdB", meter_.rms());
    }
    const std::string& why() const { return why_; }

  private:
    bool failed(const std::string& why) {
        why_ = why;
        return false;
    }
    bool seek(const qvchain::SoundRange& range, long long sample) {
        if (range.decoder->seekToSample(sample, range.stream) == QvStatus::ok) return true;
        return failed(std::string("can not seek: ") + range.decoder->errorDesc());
    }
    static long long length(const qvchain::SoundRange& range) {
        return std::max(std::min(range.to, range.decoder->nrSamples(range.stream)) - range.from, 0LL);
    }

    // What changes the number of channels makes others of them.
    static long long placesOf(const QvPcm& pcm, const qvchain::SoundRange& range) {
        const Any mask = range.decoder->getAudioParam(range.stream, "channelMask");
        const Any channels = range.decoder->getAudioParam(range.stream, "channels");
        return mask.isInt() && channels == Any(pcm.channels()) ? mask.toInt64() : 0;
    }

    bool measure(const QvPcm& pcm, const qvchain::SoundRange& range) {
        if (!metering_) {
            if (meter_.init(pcm.channels(), pcm.samplerate(), placesOf(pcm, range)) != QvStatus::ok)
                return failed("the meter does not work with " + std::to_string(pcm.channels()) +
                              " channels at " + std::to_string(pcm.samplerate()) + " Hz");
            metering_ = true;
        }
        return meter_.add(pcm) == QvStatus::ok || failed("the sound changes its format, or memory is short");
    }

    // After a block, with what is left of a range.
    bool goOn(long long left, long long all) {
        const double part = 1 - static_cast<double>(left) / static_cast<double>(all);
        return !watch_ || watch_(part) || failed("it was stopped");
    }

    bool addPlain(const qvchain::SoundRange& range) {
        const long long all = length(range);
        for (long long left = all; left > 0;) {
            const int wanted = static_cast<int>(std::min<long long>(left, blockSamples));
            const int result = range.decoder->readSamples(wanted, range.stream);
            if (result < 0 && result != QvStatus::endOfStream)
                return failed(std::string("can not read samples: ") + range.decoder->errorDesc());
            const QvPcm* pcm = range.decoder->getAudioPtr(range.stream);
            const int count = pcm && pcm->inited() ? pcm->samples() : 0;
            if (count > 0 && !measure(*pcm, range)) return false;
            if (result == QvStatus::endOfStream || count < 1) break;
            left -= count;
            if (!goOn(left, all)) return false;
        }
        return true;
    }

    // As a link does it, with silence where the filters still hold something at the end of the stream.
    bool addThroughChain(const qvchain::SoundRange& range) {
        const Pipe chain = secondChain();
        if (!chain) return false;
        if (chain->open() != QvStatus::ok) return failed(chain->errorDesc());
        int result = QvStatus::ok;
        const long long all = outputOf(*chain, length(range));
        for (long long left = all; left > 0 && result == QvStatus::ok;) {
            const int wanted = static_cast<int>(std::min<long long>(left, blockSamples));
            result = chain->process(range.decoder, range.stream, wanted);
            if (result != QvStatus::ok && result != QvStatus::endOfStream)
                return failed(*chain->errorDesc() ? chain->errorDesc() : "a filter failed");
            QvPcm* pcm = chain->samples() > 0 ? chain->pcm() : nullptr;
            if (!pcm) break;
            QvPcm due = *pcm;  // the same samples, counted up to the end only
            due.setSamples(static_cast<int>(std::min<long long>(pcm->samples(), left)));
            if (!measure(due, range)) return false;
            left -= due.samples();
            chain->erase(pcm->samples());
            if (!goOn(left, all)) return false;
        }
        return true;
    }

    // Not open yet; null with the reason.
    Pipe secondChain() {
        Pipe chain(QvAProcessPipe::create());
        if (!chain) failed("module 'aprocess' is not available");
        for (int i = 0; chain && i < filters_; ++i) {
            auto copy = copyOf(*model_.filter(i));
            if (!copy) {
                failed(std::string("filter ") + model_.filter(i)->name() + " can not be made a second time");
                return nullptr;
            }
            const AnyDict& report = reports_[static_cast<std::size_t>(i)];
            if (!report.empty()) qvSetOptionalParam(*copy, "_streamReport", report);
            chain->addFilter(copy.release(), -1);
        }
        return chain;
    }

    static long long outputOf(const QvAProcessPipe& chain, long long input) {
        for (int i = 0; i < chain.nrFilters(); ++i) {
            const QvAudioFilter& filter = *chain.filter(i);
            if (!qvModuleTraits(filter).convertsRate) continue;
            const int in = filter.getParam("inSamplerate").asInt32(0);
            const int out = filter.getParam("outSamplerate").asInt32(0);
            if (in > 0 && out > 0) input = QvRatio::multyplyByRatio(input, QvRatio(out, 1), QvRatio(in, 1));
        }
        return input;
    }

    const QvAProcessPipe& model_;
    const int filters_;
    const std::span<const AnyDict> reports_;
    const QvReadWatch& watch_;
    QvLoudness meter_;
    bool metering_ = false;
    std::string why_;
};

}  // namespace

bool qvchain::measureBefore(const QvAProcessPipe& pipe, int filter, std::span<const AnyDict> reports,
                            std::span<const SoundRange> ranges, const QvReadWatch& watch, AnyDict& levels,
                            std::string& why) {
    Measurement measurement(pipe, filter, reports, watch);
    for (const SoundRange& range : ranges) {
        if (measurement.add(range)) continue;
        why = measurement.why();
        return false;
    }
    measurement.levels(levels);
    return true;
}

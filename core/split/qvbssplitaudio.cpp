#include <algorithm>
#include <cstring>
#include <string>
#include <vector>

#include "core/arch/qvassert.h"
#include "core/arch/undo_p.h"
#include "core/engine/files/qvfileutil.h"
#include "core/engine/log/qvlog.h"
#include "core/engine/status.h"
#include "core/media/qvpcm.h"
#include "core/split/qvbufstreamsplit.h"
#include "core/split/wavheader_p.h"
#include "core/stream/file/qvfilebufstream.h"
#include "core/stream/iofailure.h"
#include "core/stream/stdfile_p.h"

namespace {

// Blocks of this size end at its multiples in the file: a page that is written in two pieces costs twice.
constexpr size_t gatheredBytes = size_t{1} << 16;

// A file of samples that is written in large blocks: one access unit has only a few kilobytes.
class SampleFile {
  public:
    bool open(const QvWideString& name, const std::shared_ptr<QvCancel>& cancel) {
        name_ = name;
        if (!file_.openOutput(name, cancel)) return false;
        file_.setUnbuffered();
        gathered_.reserve(gatheredBytes);
        return true;
    }
    bool write(const unsigned char* data, size_t bytes) {
        while (bytes) {
            const size_t piece =
                std::min(bytes, gatheredBytes - static_cast<size_t>(position_ % gatheredBytes));
            gathered_.insert(gathered_.end(), data, data + piece);
            position_ += piece;
            data += piece;
            bytes -= piece;
            if (position_ % gatheredBytes == 0 && !flush()) return false;
        }
        return file_.isOpen();
    }
    bool flush() {
        const bool ok = gathered_.empty() || file_.write(gathered_.data(), gathered_.size());
        gathered_.clear();
        return ok;
    }
    bool close() {
        if (!file_.isOpen()) return true;
        const bool flushed = flush();
        return file_.close() && flushed;
    }
    const QvWideString& name() const { return name_; }
    bool isOpen() const { return file_.isOpen(); }
    bool isStream() const { return file_.isStream(); }
    uint64_t written() const { return file_.written(); }
    uint64_t position() const { return position_; }
    int error() const { return file_.error(); }

  private:
    StdFile file_;
    QvWideString name_;
    std::vector<unsigned char> gathered_;
    unsigned long long position_ = 0;  // bytes that were written and gathered
};

}  // namespace

struct QvBsSplitAudio::Wav {
    struct File {
        SampleFile file;
        QvPcm samples;          // of its channel; in split mode only
        uint64_t trailing = 0;  // bytes after the samples
    };

    WavFormat format{};  // of the stream
    bool split = false;
    bool ended = false;
    std::vector<std::unique_ptr<File>> files;  // one for each channel, or the only one
    QvPcm work;                                // interleaved samples of one access unit; in split mode only
    AnyVector channelPointers;
    std::vector<unsigned char> chunks;  // complete chunks, to be written after the samples
    bool mayBeRf64 = false;
    unsigned carried = 0;  // bytes of an incomplete sample at the head of the ring

    WavFormat fileFormat() const {
        return split ? WavFormat{format.samplerate, 1, format.bitsPerSample} : format;
    }
};

QvBsSplitAudio::QvBsSplitAudio(QvCodec* owner) : QvBufStreamFifoCb(owner) {}

QvBsSplitAudio::~QvBsSplitAudio() { QvBsSplitAudio::destroy(0); }

int QvBsSplitAudio::initPlain(const AnyDict& newParams) {
    AnyDict merged(params());
    merged.update(newParams);
    destroy(0);
    QvBufStream::init(merged);
    Undo ending([this] { destroy(1); });
    inner_ = std::make_unique<QvFileBufStream>(owner());
    shareFailure(*inner_);
    if (const int status = inner_->init(merged)) return status;
    setInited(true);
    ending.dismiss();
    return QvStatus::ok;
}

int QvBsSplitAudio::init(const AnyDict& newParams) {
    const Any& isPcm = newParams.get("isPcm");
    if (isPcm.isInt32() && isPcm.asInt32() == 0) return initPlain(newParams);
    if (inner_ || wav_) destroy(0);
    Undo ending([this] { destroy(1); });
    wav_ = std::make_unique<Wav>();
    if (const int status = QvBufStreamFifoCb::init(newParams)) return status;
    if (const int status = openFiles()) return status;
    ending.dismiss();
    return QvStatus::ok;
}

int QvBsSplitAudio::openFiles() {
    Wav& wav = *wav_;
    const Any& mask = params().get("channelMask");
    const WavFormat format = {params().getInt32("samplerate", 0), params().getInt32("channels", 0),
                              params().getInt32("bitsPerSample", 0),
                              mask.isInt() ? static_cast<uint32_t>(mask.toInt64()) : 0};
    wav.format = format;
    wav.split = params().get("split").isTrue();
    const bool legal = wavFormatIsLegal(format) && (!wav.split || format.channels <= maxFiles);
    bufstream* ring = output();
    if (!legal || ring->chunksize(ring) < static_cast<unsigned>(format.sampleBytes())) {
        qv_log()->error("[split writer] Can not write WAV with %d Hz, %d channels, %d bits.",
                        format.samplerate, format.channels, format.bitsPerSample);
        return QvStatus::failed;
    }
    if (!takeChunks()) {
        qv_log()->error("[split writer] Can not write chunks that are not \"id\" and \"data\".");
        return QvStatus::failed;
    }
    const Any name = params().get("outfilename");
    const auto opened = [this](const Any& file) { return openFile(file) ? QvStatus::ok : QvStatus::failed; };
    if (!wav.split) return opened(name);
    if (!name.isText()) return opened(Any(""));
    if (const int status =
            wav.work.init(format.samplerate, format.channels, format.valueBytes(), format.samplerate))
        return status;
    for (int channel = 0; channel < format.channels; ++channel) {
        if (const int status = opened(_channelFileName(name, channel))) return status;
        QvPcm& samples = wav.files.back()->samples;
        if (const int status = samples.init(format.samplerate, 1, format.valueBytes(), format.samplerate))
            return status;
    }
    return QvStatus::ok;
}

Any QvBsSplitAudio::_channelFileName(const Any& name, int channel) {
    const Any number = Any::sprintf("#%02d.", channel);
    const Any file = Any::strcat(Any::strcat(QvFile::getBasename(name), number), QvFile::getExt(name, false));
    return QvFile::joinPath(QvFile::getPath(name), file);
}

// A pipe can't be patched at the end, so its header has the size that is expected.
std::array<unsigned char, wavHeaderBytes> QvBsSplitAudio::streamHeader() {
    const WavFormat format = wav_->fileFormat();
    const Any& expected = params().get("expectedSamples");
    const long long samples = expected.isInt() ? expected.toInt64() : -1;
    const auto sampleBytes = static_cast<uint64_t>(format.sampleBytes());
    const bool known = samples >= 0 && static_cast<uint64_t>(samples) < wavLengthUnknown / 2 / sampleBytes;
    const uint64_t bytes =
        known ? wavHeaderBytes + static_cast<uint64_t>(samples) * sampleBytes : wavLengthUnknown;
    return wavHeader(format, {.fileBytes = bytes, .mayBeRf64 = wav_->mayBeRf64});
}

// Reads "rf64" and "chunks"; false if an entry is no chunk.
bool QvBsSplitAudio::takeChunks() {
    constexpr size_t idBytes = 4, headBytes = 8;
    wav_->mayBeRf64 = params().get("rf64").isTrue();
    const Any& list = params().get("chunks");
    if (!list.isVector()) return !list.isValid();
    std::vector<unsigned char>& all = wav_->chunks;
    for (const Any& chunk : list.asVector()) {
        const std::string id = chunk.isDict() ? chunk.asDict().getString("id", "") : "";
        const Any& data = chunk.isDict() ? chunk.asDict().get("data") : Any::invalid();
        if (id.size() != idBytes || !data.isGeneric() || data.size() < 1) return false;
        const auto size = static_cast<size_t>(data.size());
        const auto* bytes = static_cast<const unsigned char*>(data.asGeneric());
        all.reserve(all.size() + headBytes + size + 1);
        all.insert(all.end(), id.begin(), id.end());
        for (size_t i = 0; i < idBytes; ++i) all.push_back(static_cast<unsigned char>(size >> 8 * i));
        all.insert(all.end(), bytes, bytes + size);
        if (size % 2) all.push_back(0);
    }
    return true;
}

// Appends the file to the list, and writes room for the header into it.
bool QvBsSplitAudio::openFile(const Any& name) {
    const std::string narrow = qv_os_name(name);
    auto& entry = *wav_->files.emplace_back(std::make_unique<Wav::File>());
    if (!entry.file.open(qv_wide_name(narrow), cancel())) {
        failure()->note(entry.file.error(), "Can not open file", entry.file.name());
        qv_log()->error("[split writer] Failed to open %s.", narrow.c_str());
        return false;
    }
    std::array<unsigned char, wavHeaderBytes> room{};
    if (entry.file.isStream()) room = streamHeader();
    if (entry.file.write(room.data(), room.size()) && entry.file.flush()) return true;
    failure()->note(entry.file.error(), "Failed to write to", entry.file.name());
    qv_log()->error("[split writer] Failed to write to %s.", narrow.c_str());
    entry.file.close();
    return false;
}

void QvBsSplitAudio::destroy(int abort) {
    if (wav_) {
        QvBufStreamFifoCb::destroy(abort);
        for (size_t i = 0; i < wav_->files.size(); ++i) closeFile(static_cast<int>(i));
        wav_.reset();
    }
    if (inner_) inner_->destroy(abort);
    inner_.reset();
    setInited(false);
}

void QvBsSplitAudio::flush() {
    if (wav_)
        QvBufStreamFifoCb::flush();
    else if (inner_)
        inner_->flush();
}

bufstream* QvBsSplitAudio::input() {
    if (wav_) return QvBufStreamFifoCb::input();
    QV_ASSERT(inner_);
    return inner_->input();
}

bufstream* QvBsSplitAudio::output() {
    if (wav_) return QvBufStreamFifoCb::output();
    QV_ASSERT(inner_);
    return inner_->output();
}

void QvBsSplitAudio::cbProgress(int) {}

void QvBsSplitAudio::cbAuxinfo(unsigned, unsigned id, void* info, unsigned size) {
    if (id == QvAuxId::STREAM_END_CODE) onStreamEnd();
    if (id != QvAuxId::AUDIO_AU_CODE) return;
    uint32_t bytes;
    QV_ASSERT(info && size >= sizeof bytes);
    std::memcpy(&bytes, info, sizeof bytes);
    _onAudioBytes(bytes);
}

// An access unit may end inside a sample: the rest stays in the ring and goes with the next one.
void QvBsSplitAudio::_onAudioBytes(unsigned bytes) {
    if (wav_->ended) return stopProcessing();
    bufstream* ring = output();
    const unsigned sampleBytes = static_cast<unsigned>(wav_->format.sampleBytes());
    const unsigned waiting = wav_->carried + bytes;
    QV_ASSERT(waiting >= bytes && waiting <= ring->usable(ring));
    wav_->carried = waiting % sampleBytes;
    const unsigned whole = waiting - wav_->carried;
    if (!(wav_->split ? writeChannels(ring, whole) : writeInterleaved(ring, whole))) stopProcessing();
}

// Straight from the ring to the file.
bool QvBsSplitAudio::writeInterleaved(bufstream* ring, unsigned bytes) {
    while (bytes) {
        const unsigned piece = std::min(bytes, ring->chunksize(ring));
        const unsigned char* block = ring->request(ring, piece);
        QV_ASSERT(block);
        if (!writeItem(0, block, piece)) return false;
        ring->confirm(ring, piece);
        bytes -= piece;
    }
    return true;
}

// Moves whole samples from the ring into the work buffer.
bool QvBsSplitAudio::takeSamples(bufstream* ring, unsigned bytes) {
    QvPcm& work = wav_->work;
    const unsigned sampleBytes = static_cast<unsigned>(wav_->format.sampleBytes());
    const int count = static_cast<int>(bytes / sampleBytes);
    if (count > work.size() && work.grow(count - work.size()) < 0) return false;
    work.erase(work.samples());
    const unsigned chunk = ring->chunksize(ring);
    while (bytes) {
        const unsigned piece = std::min(bytes, chunk - chunk % sampleBytes);
        const unsigned char* block = ring->request(ring, piece);
        QV_ASSERT(block);
        if (work.write(static_cast<int>(piece / sampleBytes), block)) return false;
        ring->confirm(ring, piece);
        bytes -= piece;
    }
    return true;
}

bool QvBsSplitAudio::writeChannels(bufstream* ring, unsigned bytes) {
    if (!takeSamples(ring, bytes)) return false;
    const int count = wav_->work.samples();
    if (!count) return true;
    AnyVector& pointers = wav_->channelPointers;
    pointers.clear();
    for (const auto& entry : wav_->files) {
        QvPcm& samples = entry->samples;
        if (count > samples.size() && samples.grow(count - samples.size()) < 0) return false;
        samples.setSamples(count);
        pointers.append(Any(static_cast<const void*>(samples.ptr(0)), 0));
    }
    wav_->work.combineRead(count, pointers);
    for (size_t i = 0; i < wav_->files.size(); ++i) {
        const QvPcm& samples = wav_->files[i]->samples;
        if (!writeItem(static_cast<int>(i), samples.ptr(0), static_cast<unsigned>(samples.bytes())))
            return false;
    }
    return true;
}

bool QvBsSplitAudio::writeItem(int file, const unsigned char* data, unsigned bytes) {
    auto& entry = *wav_->files[static_cast<size_t>(file)];
    if (entry.file.write(data, bytes)) return true;
    failure()->report(entry.file.error(), "Failed to write to", entry.file.name());
    return false;
}

// Chunks begin at an even offset.
bool QvBsSplitAudio::writeChunks(int file) {
    auto& entry = *wav_->files[static_cast<size_t>(file)];
    const auto& chunks = wav_->chunks;
    if (chunks.empty() || !entry.file.isOpen() || entry.file.isStream()) return true;
    constexpr unsigned char padding = 0;
    const unsigned odd = entry.file.position() % 2;
    entry.trailing = odd + chunks.size();
    return writeItem(file, &padding, odd) &&
           writeItem(file, chunks.data(), static_cast<unsigned>(chunks.size()));
}

bool QvBsSplitAudio::closeFile(int file) {
    auto& entry = *wav_->files[static_cast<size_t>(file)];
    if (!entry.file.isOpen()) return true;
    const bool closed = entry.file.close();
    failure()->countTaken(entry.file.written());
    if (closed) return true;
    failure()->report(entry.file.error(), "Failed to write to", entry.file.name());
    return false;
}

void QvBsSplitAudio::onStreamEnd() {
    if (!wav_ || wav_->ended) return;
    wav_->ended = true;
    if (wav_->carried)
        qv_log()->warning("[split writer] The stream ends inside a sample: %u bytes are dropped.",
                          wav_->carried);
    bool closed = true;
    for (int i = 0; i < static_cast<int>(wav_->files.size()); ++i) {
        closed &= writeChunks(i);
        closed &= closeFile(i);
    }
    if (!closed) stopProcessing();
    _writeWavHeaders();
    for (const auto& entry : wav_->files) entry->samples.destroy();
    wav_->work.destroy();
}

void QvBsSplitAudio::_writeWavHeaders() {
    for (const auto& entry : wav_->files)
        if (!entry->file.isStream())
            writeWavHeader(entry->file.name(), wav_->fileFormat(), *failure(), entry->trailing,
                           wav_->mayBeRf64);
}

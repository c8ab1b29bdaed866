#include "builtin/muxers/filestreams.h"

#include <algorithm>
#include <cstring>
#include <memory>
#include <vector>

#include "builtin/muxers/streamcodec.h"
#include "builtin/shared/rawoutput.h"
#include "core/arch/qvcancel.h"
#include "core/arch/undo_p.h"
#include "core/encode/qvfilemux.h"
#include "core/encode/qvmuxer.h"
#include "core/engine/files/qvfileutil.h"
#include "core/engine/modules/qvmodule.h"
#include "core/engine/modules/qvregistry.h"
#include "core/engine/status.h"
#include "core/stream/auxinfoid.h"
#include "core/stream/qvbufstrm.h"
#include "core/stream/qvbytesource.h"

namespace {

constexpr long long blockBytes = 256 * 1024;  // of a stream without known units
constexpr long long mostUnitBytes = 1LL << 30;
constexpr int blocksPerSecond = 25;  // of sound
constexpr unsigned videoInfoBytes = 32, audioInfoBytes = 16;

// Takes the place of the encoder of a stream: answers what the multiplexer asks the encoder.
class FileEncoder : public QvEncoder {
  public:
    FileEncoder(const QvModule* module, const QvFileMuxStream& stream) : QvEncoder(module), stream_(stream) {
        init();
        extension_ = stream.extension;
        if (!extension_.isText() && module) {
            const std::unique_ptr<QvCodec> codec(qv_registry()->newCodec(module->name()));
            if (codec) extension_ = codec->getParam("extension");
        }
        if (!extension_.isText()) extension_ = QvFile::getExt(stream.file, true);
    }

    using QvCodec::getParam;
    int setParam(const char* name, const Any& value) override { return QvCodec::setParam(name, value); }
    void getParam(const char* name, Any& value) const override {
        const auto is = [name](const char* other) { return std::strcmp(name, other) == 0; };
        if (is("extension"))
            value = extension_;
        else if (stream_.params.isSet(name))
            value = stream_.params.get(name);
        else if (stream_.type == qvVideoStream && is("framerate"))
            value = stream_.framerate;
        else if (stream_.type == qvAudioStream && is("samplerate"))
            value = stream_.samplerate;
        else if (stream_.type == qvAudioStream && is("channels"))
            value = stream_.channels;
        else if (stream_.type == qvAudioStream && is("bitsPerSample"))
            value = stream_.bitsPerSample;
        else
            QvCodec::getParam(name, value);
    }
    int open() override { return QvStatus::ok; }
    int close() override { return QvStatus::ok; }
    void* getInterface(int) const override { return nullptr; }

  private:
    const QvFileMuxStream& stream_;
    Any extension_;
};

// Passes one file to its stream of the multiplexer, unit by unit.
class FileFeed {
  public:
    FileFeed(const QvFileMuxStream& stream, const QvModule* module)
        : stream_(stream), encoder_(module, stream) {}
    FileFeed(const FileFeed&) = delete;
    FileFeed& operator=(const FileFeed&) = delete;
    ~FileFeed() {
        if (to_) to_->setAtachee(nullptr);
    }

    // Each returns why it failed, or "".
    std::string begin(QvMuxer& muxer);
    std::string writeUnit();
    std::string end();

    bool done() const { return written_ == length_; }
    long long length() const { return length_; }
    long long written() const { return written_; }
    double seconds() const;  // of what is written
    void attach(const std::shared_ptr<QvCancel>& cancel) { to_->setCancel(cancel); }

  private:
    const QvFileMuxStream& stream_;
    FileEncoder encoder_;
    QvBufStream* to_ = nullptr;  // the multiplexer's
    std::unique_ptr<QvByteSource> file_;
    std::vector<unsigned char> block_;
    long long length_ = 0;
    long long written_ = 0;
    std::size_t unit_ = 0;       // number of the next one
    long long unitBytes_ = 0;    // of all units; 0: as stream_.units says
    long long sampleBytes_ = 1;  // pieces of sound are multiples of this
    bool announced_ = false;     // units are announced

    std::string measure();
    std::string put(long long bytes);
};

std::string FileFeed::begin(QvMuxer& muxer) {
    file_ = stream_.parts.empty() ? qvFileSource(stream_.file, 1) : qvFilePartsSource(stream_.parts, 1);
    length_ = file_ ? file_->size() : QvByteSource::unknown;
    if (length_ < 1) return "it can't be opened, or is empty";
    if (std::string why = measure(); !why.empty()) return why;
    AnyDict params = stream_.params;
    params.set("codec", stream_.codec);
    params.set("extension", encoder_.getParam("extension"));
    to_ = muxer.addStream(stream_.type, params);
    if (!to_) return std::string(muxer.name()) + " takes no further stream of this type";
    to_->setAtachee(&encoder_);
    return "";
}

std::string FileFeed::measure() {
    std::string problem;
    const long long whole = stream_.wholeBytes(problem);
    if (!problem.empty()) return problem;
    announced_ = whole > 0 || !stream_.units.empty();
    if (stream_.type == qvAudioStream && whole > 0) sampleBytes_ = whole;
    if (!stream_.units.empty()) return "";
    unitBytes_ = whole;
    if (whole == 0) unitBytes_ = blockBytes;
    if (whole > 0 && stream_.type == qvAudioStream)
        unitBytes_ = std::max(stream_.samplerate / blocksPerSecond, 1) * whole;
    return "";
}

double FileFeed::seconds() const {
    if (stream_.type == qvVideoStream && announced_)
        return static_cast<double>(unit_) / stream_.framerate.rate().ratio();
    if (stream_.type == qvAudioStream && sampleBytes_ > 1) {
        const long long samples = written_ / sampleBytes_;
        return static_cast<double>(samples) / stream_.samplerate;
    }
    // Without a time, by its part of the file: from 0 to 1.
    return static_cast<double>(written_) / static_cast<double>(length_);
}

std::string FileFeed::writeUnit() {
    const long long left = length_ - written_;
    const long long bytes = unitBytes_ > 0                 ? std::min(unitBytes_, left)
                            : unit_ < stream_.units.size() ? stream_.units[unit_]
                                                           : left;
    if (bytes < 1 || bytes > left || bytes > mostUnitBytes)
        return "unit " + std::to_string(unit_) + " has " + std::to_string(bytes) + " bytes";
    block_.resize(static_cast<std::size_t>(bytes));
    if (file_->read(block_.data(), block_.size()) != block_.size()) {
        const std::string why = file_->problem();
        return why.empty() ? "it could not be read to its end" : why;
    }
    if (std::string why = put(bytes); !why.empty()) return why;
    written_ += bytes;
    ++unit_;
    return "";
}

// Sound is cut into blocks that the stream can take.
std::string FileFeed::put(long long bytes) {
    RawOutput output(*to_);
    long long piece = bytes;
    if (const auto largest = static_cast<long long>(output.largestBlock());
        stream_.type == qvAudioStream && output.cutsUnits() && largest >= sampleBytes_)
        piece = std::min(bytes, largest / sampleBytes_ * sampleBytes_);
    for (long long at = 0; at < bytes; at += piece) {
        piece = std::min(piece, bytes - at);
        switch (output.put(block_.data() + at, static_cast<uint64_t>(piece))) {
            case RawPutResult::ok: break;
            case RawPutResult::failed: return output.fault();
            case RawPutResult::noBlock:
                return "the output takes no block of " + std::to_string(output.asked()) + " bytes";
        }
        if (!announced_) continue;
        const bool video = stream_.type == qvVideoStream;
        if (output.announce(video ? QvAuxId::VIDEO_AU_CODE : QvAuxId::AUDIO_AU_CODE,
                            static_cast<uint64_t>(piece), video ? videoInfoBytes : audioInfoBytes) != 0)
            return output.sound() ? "the output did not take a unit" : output.fault();
    }
    return output.sound() ? "" : output.fault();
}

// By this the multiplexer completes the sizes in the header of sound.
std::string FileFeed::end() {
    if (stream_.type != qvAudioStream) return "";
    auto* out = to_->input();
    out->auxinfo(out, 0, QvAuxId::STREAM_END_CODE, nullptr, 0);
    return to_->ioError() == 0 ? "" : to_->ioErrorText();
}

class FileMultiplexer {
  public:
    FileMultiplexer(QvMuxer& muxer, QvFileMuxConfig& config, std::string& error)
        : muxer_(muxer), config_(config), error_(error) {}

    int run(QvBufStream& output);

  private:
    QvMuxer& muxer_;
    QvFileMuxConfig& config_;
    std::string& error_;
    std::vector<std::unique_ptr<FileFeed>> feeds_;
    long long total_ = 0;

    int begin();
    int checkNames();
    int feed();
    int fail(std::size_t index, const std::string& why);
};

int FileMultiplexer::fail(std::size_t index, const std::string& why) {
    if (config_.stopped()) return QvFileMux::cancelled;
    error_ = config_.place(index) + ": " + why;
    return QvStatus::failed;
}

int FileMultiplexer::begin() {
    for (std::size_t i = 0; i < config_.streams.size(); ++i) {
        const QvFileMuxStream& stream = config_.streams[i];
        feeds_.push_back(
            std::make_unique<FileFeed>(stream, qv_registry()->module(stream.codec.toString().asString(""))));
        if (const std::string why = feeds_.back()->begin(muxer_); !why.empty()) return fail(i, why);
        feeds_.back()->attach(config_.cancel);
        total_ += feeds_.back()->length();
    }
    if (const int result = checkNames(); result != QvStatus::ok) return result;
    if (const int result = muxer_.open(); result != QvStatus::ok) {
        error_ = muxer_.errorDesc();
        return result;
    }
    return QvStatus::ok;
}

// A multiplexer that makes names of its own could write over what it is to read.
int FileMultiplexer::checkNames() {
    const Any names = muxer_.getParam("filenames");
    if (!names.isVector()) return QvStatus::ok;
    for (const Any& name : names.asVector())
        for (std::size_t i = 0; i < config_.streams.size(); ++i)
            if (config_.streams[i].reads(name)) return fail(i, "it is an output, too");
    return QvStatus::ok;
}

// The stream with the earliest time is next, so that a container gets picture and sound of one time together.
int FileMultiplexer::feed() {
    long long written = 0;
    while (written < total_) {
        if (config_.stopped()) return QvFileMux::cancelled;
        std::size_t next = feeds_.size();
        for (std::size_t i = 0; i < feeds_.size(); ++i)
            if (!feeds_[i]->done() &&
                (next == feeds_.size() || feeds_[i]->seconds() < feeds_[next]->seconds()))
                next = i;
        const long long before = feeds_[next]->written();
        if (const std::string why = feeds_[next]->writeUnit(); !why.empty()) return fail(next, why);
        written += feeds_[next]->written() - before;
        if (config_.watch && !config_.watch(static_cast<double>(written) / static_cast<double>(total_)))
            return QvFileMux::cancelled;
    }
    for (std::size_t i = 0; i < feeds_.size(); ++i)
        if (const std::string why = feeds_[i]->end(); !why.empty()) return fail(i, why);
    return QvStatus::ok;
}

int FileMultiplexer::run(QvBufStream& output) {
    if (config_.streams.empty()) {
        error_ = "There is no stream to multiplex";
        return QvStatus::invalidArgument;
    }
    if (muxer_.nrStreams(0) != 0) {
        error_ = "The multiplexer has streams already";
        return QvStatus::illegalState;
    }
    const bool mine = output.atachee() != &muxer_;
    if (mine && muxer_.attachOutStream(&output) != QvStatus::ok) {
        error_ = "The output can't be attached";
        return QvStatus::failed;
    }
    const Undo detaching([&] {
        if (mine) muxer_.detachOutStream();
    });
    const Undo removing([this] {
        feeds_.clear();
        muxer_.removeStreams(qvAllStreams);
    });
    Undo aborting([this] { muxer_.abort(); });
    if (const int result = begin(); result != QvStatus::ok) return result;
    if (const int result = feed(); result != QvStatus::ok) return result;
    aborting.dismiss();
    if (const int result = muxer_.close(); result != QvStatus::ok) {
        error_ = muxer_.errorDesc();
        return result;
    }
    return QvStatus::ok;
}

}  // namespace

int qvMuxFiles(QvMuxer& muxer, QvFileMuxConfig& config, QvBufStream& output, std::string& error) {
    return FileMultiplexer(muxer, config, error).run(output);
}

#include "core/encode/qvfilemux.h"

#include <algorithm>
#include <limits>

#include "core/arch/qvcancel.h"
#include "core/arch/undo_p.h"
#include "core/encode/qvmuxer.h"
#include "core/encode/qvsink.h"
#include "core/engine/files/qvfileutil.h"
#include "core/engine/modules/moduletraits_p.h"
#include "core/engine/modules/optionalparam_p.h"
#include "core/engine/modules/qvmodule.h"
#include "core/engine/modules/qvregistry.h"
#include "core/engine/status.h"
#include "core/measure/fourcc.h"
#include "core/media/qvframe.h"
#include "core/stream/qvbufstrm.h"

namespace {

constexpr int mostSamplerate = 1'000'000;
constexpr int mostChannels = 256;
constexpr int mostBits = 64;
constexpr double mostFramerate = 1e6;

std::string textOf(const Any& name) { return name.isText() ? qv_os_name(name) : ""; }

std::string numbers(long long first, const char* between, long long second) {
    return std::to_string(first) + between + std::to_string(second);
}

// What is wrong with the sizes of the units; "" if nothing is.
std::string unitProblem(const std::vector<long long>& units, long long length) {
    long long sum = 0;
    for (std::size_t i = 0; i < units.size(); ++i) {
        if (units[i] < 1) return "unit " + numbers(static_cast<long long>(i), " has a size of ", units[i]);
        if (units[i] > length - sum)
            return "unit " + std::to_string(i) + " of " +
                   numbers(units[i], " bytes ends after the file's ", length);
        sum += units[i];
    }
    if (units.empty() || sum == length) return "";
    return "the units are " + numbers(sum, " bytes, the file has ", length);
}

std::string formatProblem(const QvFileMuxStream& stream) {
    if (stream.type == qvVideoStream) {
        const double rate = stream.framerate.rate().ratio();
        return rate > 0 && rate <= mostFramerate ? "" : "it has no frame rate";
    }
    if (stream.type != qvAudioStream) return "";
    if (stream.samplerate < 1 || stream.samplerate > mostSamplerate)
        return numbers(stream.samplerate, " Hz is not within 1 to ", mostSamplerate);
    if (stream.channels < 1 || stream.channels > mostChannels)
        return numbers(stream.channels, " channels are not within 1 to ", mostChannels);
    if (stream.bitsPerSample < 0 || stream.bitsPerSample > mostBits)
        return numbers(stream.bitsPerSample, " bits are not within 0 to ", mostBits);
    return "";
}

long long pictureBytes(const AnyDict& params, std::string& problem) {
    const auto fourcc = static_cast<unsigned>(params.getInt32("type", 0));
    const int width = params.getInt32("width", 0), height = params.getInt32("height", 0);
    QvFrame frame;
    if (width >= 1 && height >= 1 && qvPixelFormat(fourcc) &&
        frame.init(fourcc, width, height) == QvStatus::ok && frame.total_bytes() > 0)
        return frame.total_bytes();
    problem = std::string("there are no raw pictures ") + qvFourccText(fourcc).data() + " of " +
              numbers(width, "x", height);
    return 0;
}

// What of uncompressed data is not whole.
std::string wholeProblem(const QvFileMuxStream& stream, long long length) {
    std::string problem;
    const long long whole = stream.recorded ? 0 : stream.wholeBytes(problem);
    if (whole == 0) return problem;
    const bool video = stream.type == qvVideoStream;
    for (std::size_t i = 0; i < stream.units.size(); ++i)
        if (video ? stream.units[i] != whole : stream.units[i] % whole != 0)
            return "unit " + numbers(static_cast<long long>(i), " has ", stream.units[i]) +
                   (video ? " bytes, a picture " : " bytes, a sample of all channels ") +
                   std::to_string(whole);
    if (length % whole == 0) return "";
    return std::string("after the last whole ") + (video ? "picture" : "sample") + " there are " +
           std::to_string(length % whole) + " bytes";
}

bool takesRecords(const QvMuxer& muxer) {
    return muxer.module() && muxer.module()->getAttr("recorder").isValid();
}

}  // namespace

// --- The configuration.

long long QvFileMuxStream::wholeBytes(std::string& problem) const {
    const std::string name = codec.isText() ? qv_os_name(codec) : "";
    if (!qvModuleTraits(name, qv_registry()->module(name.c_str())).uncompressed) return 0;
    if (type == qvVideoStream) return pictureBytes(params, problem);
    if (type == qvAudioStream && bitsPerSample < 1) problem = "its bits a sample are not set";
    return type == qvAudioStream ? static_cast<long long>(channels) * ((bitsPerSample + 7) / 8) : 0;
}

long long QvFileMuxStream::length() const {
    if (!parts.empty() && recorded) {
        long long sum = 0;
        for (const QvFilePart& part : parts) {
            const long long bytes = QvFile::flength(part.file);
            if (bytes < 0) return bytes;
            sum += bytes;
        }
        return sum;
    }
    if (!parts.empty()) return qvFilePartsBytes(parts);
    return textOf(file).empty() ? -1 : QvFile::flength(file);
}

bool QvFileMuxStream::reads(const Any& name) const {
    if (parts.empty()) return QvFile::isSameFile(name, file);
    return std::any_of(parts.begin(), parts.end(),
                       [&](const QvFilePart& part) { return QvFile::isSameFile(name, part.file); });
}

QvFileMuxStream& QvFileMuxConfig::addStream(int type, const Any& file, const Any& codec) {
    QvFileMuxStream& stream = streams.emplace_back();
    stream.type = type;
    stream.file = file;
    stream.codec = codec;
    return stream;
}

std::string QvFileMuxConfig::place(std::size_t index) const {
    int number = 0;
    for (std::size_t i = 0; i < index; ++i) number += streams[i].type == streams[index].type ? 1 : 0;
    const int type = streams[index].type;
    const char* kind = type == qvVideoStream ? "Video" : type == qvAudioStream ? "Audio" : "Subpicture";
    return std::string(kind) + " stream #" + std::to_string(number) + ", '" + textOf(streams[index].file) +
           "'";
}

bool QvFileMuxConfig::stopped() const { return cancel && cancel->requested(); }

// --- The front end.

QvFileMux::QvFileMux() : cancel_(std::make_shared<QvCancel>()) {}

QvFileMux::~QvFileMux() = default;

void QvFileMux::requestStop() { cancel_->request(); }

int QvFileMux::fail(int code, const std::string& text) {
    error_ = text;
    code_ = code;
    return code;
}

int QvFileMux::check() {
    fail(QvStatus::ok, "");
    if (config_.streams.empty()) return fail(QvStatus::invalidArgument, "There is no stream to multiplex");
    for (std::size_t i = 0; i < config_.streams.size(); ++i)
        if (const int result = checkStream(i); result != QvStatus::ok) return result;
    return QvStatus::ok;
}

int QvFileMux::checkStream(std::size_t index) {
    const QvFileMuxStream& stream = config_.streams[index];
    const auto refuse = [&](const std::string& why) {
        return fail(QvStatus::invalidArgument, config_.place(index) + ": " + why);
    };
    if (stream.type != qvVideoStream && stream.type != qvAudioStream && stream.type != qvSubpicStream)
        return refuse("there is no type " + std::to_string(stream.type));
    if (!stream.codec.isText() || stream.codec.size() == 0) return refuse("its codec is not set");
    const long long length = stream.length();
    if (length < 0) return refuse("it can't be opened, or is no regular file");
    if (length == 0) return refuse("it is empty");
    std::string why = formatProblem(stream);
    if (why.empty()) why = unitProblem(stream.units, length);
    if (why.empty()) why = wholeProblem(stream, length);
    return why.empty() ? QvStatus::ok : refuse(why);
}

int QvFileMux::checkOutput(const Any& output) {
    if (textOf(output).empty()) return fail(QvStatus::invalidArgument, "The output has no name");
    for (std::size_t i = 0; i < config_.streams.size(); ++i)
        if (config_.streams[i].reads(output))
            return fail(QvStatus::invalidArgument, config_.place(i) + ": it is the output, too");
    return QvStatus::ok;
}

int QvFileMux::setUp(QvMuxer& muxer, const Any& output) {
    qvSetOptionalParam(muxer, "filename", output);
    for (const auto [name, value] : config_.output)
        if (qvSetOptionalParam(muxer, name, *value) != QvStatus::ok)
            return fail(QvStatus::invalidParam, std::string(muxer.name()) + " does not take the parameter '" +
                                                    name + "'" + (*muxer.errorDesc() ? ": " : "") +
                                                    muxer.errorDesc());
    return QvStatus::ok;
}

// Before the output is opened, which ends what it held.
int QvFileMux::checkMuxer(QvMuxer& muxer, QvBufStream& output) {
    QvFileMuxConfig none;
    if (muxer.muxElementaryStreams(none, output) == QvStatus::failed && !*muxer.errorDesc())
        return fail(QvStatus::failed, std::string(muxer.name()) + " does not multiplex files");
    for (std::size_t i = 0; i < config_.streams.size(); ++i)
        if (config_.streams[i].recorded && !takesRecords(muxer))
            return fail(QvStatus::invalidArgument,
                        config_.place(i) + ": " + muxer.name() + " takes no recorded units");
    const Any limits = muxer.getParam("maxStreams");
    if (!limits.isDict()) return QvStatus::ok;
    constexpr int any = std::numeric_limits<int>::max();
    const auto takes = [&](const char* key) { return limits.asDict().getInt32(key, any); };
    int left[] = {takes("vids"), takes("auds"), takes("subs"), takes("total")};
    for (std::size_t i = 0; i < config_.streams.size(); ++i) {
        const int type = config_.streams[i].type;
        int& ofType = left[type == qvVideoStream ? 0 : type == qvAudioStream ? 1 : 2];
        if (--ofType < 0 || --left[3] < 0)
            return fail(QvStatus::invalidArgument,
                        config_.place(i) + ": " + muxer.name() + " takes no further stream of this type");
    }
    return QvStatus::ok;
}

int QvFileMux::run(const char* muxer, const Any& output) {
    cancel_->clear();
    written_.clear();
    if (!muxer) return fail(QvStatus::invalidArgument, "There is no multiplexer");
    if (const int result = check(); result != QvStatus::ok) return result;
    if (const int result = checkOutput(output); result != QvStatus::ok) return result;
    const std::unique_ptr<QvCodec> codec(qv_registry()->newCodec(muxer));
    auto* made = codec ? static_cast<QvMuxer*>(codec->getInterface(QvModuleType::muxer)) : nullptr;
    if (!made) return fail(QvStatus::failed, std::string("There is no multiplexer ") + muxer);
    if (const int result = setUp(*made, output); result != QvStatus::ok) return result;
    config_.cancel = cancel_;
    const Undo forgetting([this] { config_.cancel.reset(); });
    return multiplex(*made, output);
}

// The sink is opened after the multiplexer is attached to it, which may tell it that it has nothing to write.
int QvFileMux::multiplex(QvMuxer& muxer, const Any& output) {
    const std::unique_ptr<QvCodec> codec(qv_registry()->newCodec("filesink"));
    auto* sink = codec ? static_cast<QvSink*>(codec->getInterface(QvModuleType::sink)) : nullptr;
    if (!sink) return fail(QvStatus::failed, "There is no sink for files");
    sink->setParam("filename", output);
    QvBufStream& stream = *sink->stream();
    if (const int result = checkMuxer(muxer, stream); result != QvStatus::ok) return result;
    stream.setCancel(cancel_);
    if (muxer.attachOutStream(&stream) != QvStatus::ok) return fail(QvStatus::failed, muxer.errorDesc());
    const Undo detaching([&muxer] { muxer.detachOutStream(); });
    if (const int result = sink->open(); result != QvStatus::ok)
        return fail(result, std::string(sink->errorDesc()) + " '" + textOf(output) + "'");
    int result = QvStatus::failed;
    {
        Undo aborting([sink] { sink->abort(); });
        result = muxer.muxElementaryStreams(config_, stream);
        if (result == QvStatus::ok) aborting.dismiss();
    }
    std::string why = muxer.errorDesc();
    if (result == QvStatus::ok && sink->close() != QvStatus::ok) {
        result = QvStatus::failed;
        why = sink->errorDesc();
    }
    // Of what is written when a file is closed only the stream knows.
    if (result == QvStatus::ok && stream.ioError() != 0) {
        result = QvStatus::failed;
        why = stream.ioErrorText();
    }
    for (const QvCodec* writer : {static_cast<const QvCodec*>(&muxer), static_cast<const QvCodec*>(sink)}) {
        const Any names = writer->getParam("filesWritten");
        if (!names.isVector()) continue;
        for (const Any& name : names.asVector()) written_.append(name);
    }
    if (result == QvStatus::ok) return result;
    if (result == cancelled || cancel_->requested()) return fail(cancelled, "The run was stopped");
    return fail(result, why.empty() ? std::string(muxer.name()) + " failed" : why);
}

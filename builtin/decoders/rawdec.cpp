#include "builtin/decoders/rawdec.h"

#include <algorithm>
#include <cstring>
#include <limits>
#include <utility>

#include "builtin/creators.h"
#include "core/arch/qvassert.h"
#include "core/engine/modules/params.h"
#include "core/engine/modules/qvmodule.h"
#include "core/engine/modules/qvregistry.h"
#include "core/engine/status.h"
#include "core/filter/qvfilter.h"

namespace {

using Settings = RawDecoder::Settings;

constexpr std::size_t readAhead = 4096;
constexpr unsigned deliveredForV210 = QvFourcc::Y216;
constexpr int leastForV210 = 4;  // pixels either way; the converter makes smaller pictures black

int setFramerate(Settings& settings, const Any& value) {
    if (value.isFramerate()) {
        const QvFramerate& rate = value.asFramerate();
        if (!(double(rate.rate()) > 0)) return QvStatus::invalidParam;
        settings.framerate.setAll(rate.rate(), rate.interlaced(), false, 0);
        return QvStatus::ok;
    }
    // What no fraction of 32-bit numbers comes near to is no rate either.
    constexpr double most = 1e6;
    if (!(value.isInt() || value.isFloat())) return QvStatus::invalidParam;
    if (!(value.toDouble() >= 1 / most && value.toDouble() <= most)) return QvStatus::invalidParam;
    settings.framerate.setRate(value.toDouble());
    return QvStatus::ok;
}

int setInterlaced(Settings& settings, const Any& value) {
    int flag = 0;
    if (!qvparam::convert(value, flag) || flag < 0 || flag > 2) return QvStatus::invalidParam;
    settings.framerate.setInterlaced(flag);
    return QvStatus::ok;
}

constexpr double anyOffset = 9.0e18;
// How the width, the height and the rate are answered: as parameters of the stream only.
constexpr unsigned ofStream = qvParamWriteOnly;

const QvParamRow<Settings> rows[] = {
    {.name = "filename", .flags = qvParamByHand, .help = "the file", .type = Any::String},
    {.name = qvSourceParam,
     .flags = qvParamByHand,
     .help = "a byte source in the place of the file",
     .type = Any::Generic},
    {.name = "FOURCC",
     .flags = qvParamByHand | qvParamNeeded,
     .help = "pixel format, text or number; also BGR6 (16 bits a component) and BGRU (rows not padded)",
     .type = Any::String},
    {.name = "extendedFOURCC", .flags = qvParamByHand, .help = "as FOURCC", .type = Any::String},
    {.name = "width",
     .member = &Settings::width,
     .flags = ofStream | qvParamNeeded,
     .unit = "pixels",
     .help = "of the frames in the file"},
    {.name = "height",
     .member = &Settings::height,
     .flags = ofStream | qvParamNeeded,
     .unit = "pixels",
     .help = "of the frames in the file"},
    {.name = "framerate",
     .member = QvParamAccess<Settings>{setFramerate, nullptr},
     .flags = ofStream,
     .help = "a frame rate, or frames/s; 25 if it is not set",
     .type = Any::Framerate},
    {"frameAspect", &Settings::frameAspect, ofStream, 0, 1e6, "of the picture, 0 for square pixels"},
    {"invert", &Settings::invert, qvParamPlain, 0, 1, "rows are bottom first"},
    {"fieldOrderFile", &Settings::fieldOrderFile, qvParamPlain, 0, 1, "fields follow each other"},
    {"offset", &Settings::offset, qvParamPlain, 0, anyOffset, "bytes to skip", "bytes", "", Any::Int64},
    {"interlacedFlag",
     QvParamAccess<Settings>{setInterlaced,
                             [](const Settings& s, Any& value) { value = s.framerate.interlaced(); }},
     qvParamPlain, 0, 2, "", "", "0 progressive, 1 top field first, 2 bottom field first"},
};

}  // namespace

RawDecoder::RawDecoder(const QvModule* module) : QvDecodePipe(module) {}

RawDecoder::~RawDecoder() = default;

int RawDecoder::init() {
    if (const int result = QvDecodePipe::init(); result != QvStatus::ok) return result;
    return changeFormat(QvFourcc::BGR4);
}

// --- Parameters.

int RawDecoder::setParam(const char* name, const Any& value) {
    QV_ASSERT_MSG(getState() >= stateInitialised, "Not inited");
    _traceParam(name, value);
    if (std::strcmp(name, "filename") == 0) {
        if (getState() == stateOpen && !(value == filename_)) close();
        filename_ = value;
        return QvStatus::ok;
    }
    if (std::strcmp(name, qvSourceParam) == 0) return setSource(value);
    if (std::strcmp(name, "FOURCC") == 0 || std::strcmp(name, "extendedFOURCC") == 0) return setFOURCC(value);
    Settings changed = settings_;
    if (const auto result = qvSetParamRow<Settings>(rows, changed, name, value))
        return *result == QvStatus::ok ? changeSettings(changed)
                                       : setError(*result, "Invalid value of parameter '%s'", name);
    return QvDecodePipe::setParam(name, value);
}

int RawDecoder::setSource(const Any& value) {
    if (value.isValid() && !qvSourceOf(value))
        return setError(QvStatus::invalidParam, "Invalid value of parameter '%s'", qvSourceParam);
    if (getState() == stateOpen) close();
    source_ = qvSourceOf(value);
    return QvStatus::ok;
}

int RawDecoder::setFOURCC(const Any& value) {
    unsigned code = 0;
    if (value.isInt())
        code = static_cast<unsigned>(value.toInt32());
    else if (value.isString() && value.size() >= 4)
        std::memcpy(&code, value.asString(), sizeof code);
    return code == extendedFOURCC_ ? QvStatus::ok : changeFormat(code);
}

int RawDecoder::changeFormat(unsigned code) {
    FileFormat format = FileFormat::plain;
    unsigned frameCode = code;
    if (code == qvFourcc("BGR6")) {
        format = FileFormat::rgb48;
        frameCode = QvFourcc::BGR3;
    } else if (code == qvFourcc("BGRU")) {
        format = FileFormat::rgbUnpadded;
        frameCode = QvFourcc::BGR3;
    } else if (code == QvFourcc::v210) {
        format = FileFormat::v210;
    }
    if (!qvPixelFormat(frameCode))
        return setError(QvStatus::invalidParam, "Unknown fourCC :%s", qvFourccText(code).data());
    extendedFOURCC_ = code;
    fileFormat_ = format;
    fourcc_ = frameCode;
    return makeFrame();
}

int RawDecoder::changeSettings(const Settings& changed) {
    const Settings before = std::exchange(settings_, changed);
    if (before.width != settings_.width || before.height != settings_.height) return makeFrame();
    if (before.fieldOrderFile != settings_.fieldOrderFile ||
        before.framerate.interlaced() != settings_.framerate.interlaced())
        makeFields();
    if (before.offset != settings_.offset) return rewind();
    return QvStatus::ok;
}

// Without a frame the decoder does not open: a refused size must not end in pictures of another one.
int RawDecoder::makeFrame() {
    frame_.destroy();
    const bool inited = settings_.width > 0 && settings_.height > 0 &&
                        frame_.init(fourcc_, settings_.width, settings_.height) == QvStatus::ok;
    if (!inited || frame_.total_bytes() == 0) {
        frame_.destroy();
        return setError(QvStatus::invalidParam, "Invalid frame size %dx%d", settings_.width,
                        settings_.height);
    }
    makeFields();
    if (getState() != stateOpen) return QvStatus::ok;
    const int result = makeConverter();
    return result == QvStatus::ok ? rewind() : result;
}

void RawDecoder::makeFields() {
    for (QvFrame& field : fields_) field.destroy();
    if (!isFieldFile() || !frame_.inited()) return;
    for (QvFrame& field : fields_) field.init(fourcc_, settings_.width, settings_.height / 2);
}

int RawDecoder::checkFields() {
    if (!isFieldFile() || 2LL * fields_[0].total_bytes() == frame_.total_bytes()) return QvStatus::ok;
    return setError(QvStatus::failed, "Frames of %dx%d can not be read by fields", settings_.width,
                    settings_.height);
}

int RawDecoder::makeConverter() {
    converter_.reset();
    if (fileFormat_ != FileFormat::v210) return QvStatus::ok;
    if (settings_.width < leastForV210 || settings_.height < leastForV210)
        return setError(QvStatus::failed, "Invalid frame size %dx%d", settings_.width, settings_.height);
    std::unique_ptr<QvCodec> converter(qv_registry()->newCodec("colorconv"));
    if (!converter || !converter->getInterface(QvModuleType::videoFilter))
        return setError(QvStatus::failed, "media dec: no converter for v210");
    converter->setParam("outWidth", settings_.width);
    converter->setParam("outHeight", settings_.height);
    converter->setParam("FOURCC", Any(static_cast<int>(deliveredForV210)));
    if (const int result = converter->open(); result != QvStatus::ok)
        return setError(QvStatus::failed, "media dec: no converter for v210");
    converter_ = std::move(converter);
    return QvStatus::ok;
}

QvVideoFilter* RawDecoder::converterFilter() const {
    return static_cast<QvVideoFilter*>(converter_->getInterface(QvModuleType::videoFilter));
}

int RawDecoder::rewind() {
    if (getState() != stateOpen) return QvStatus::ok;
    frameNr_ = -1;
    pending_ = false;
    return file_.seek(settings_.offset)
               ? QvStatus::ok
               : setError(QvStatus::failed, "Invalid seek pos%s", file_.problem().c_str());
}

void RawDecoder::getParam(const char* name, Any& value) const {
    const auto is = [name](const char* other) { return std::strcmp(name, other) == 0; };
    if (is("filename"))
        value = filename_;
    else if (is("displayName"))
        value = displayName();
    else if (is("filesize"))
        value = file_.length();
    else if (is("extendedFOURCC"))
        value = qvFourccText(extendedFOURCC_).data();
    else if (is("typeName"))
        value = qvFourccText(extendedFOURCC_).data();
    else if (is("instantSeek"))
        value = seekable_ ? 1 : 0;
    else if (is("notSeekable"))
        value = seekable_ ? 0 : 1;
    else if (is("framesFloat"))
        value = frameBytes() > 0 ? static_cast<double>(payload()) / static_cast<double>(frameBytes()) : 0.0;
    else if (is("interlaced"))
        value = settings_.framerate.interlaced() != 0 ? 1 : 0;
    else if (is("topFirst"))
        value = settings_.framerate.isTopFirst() ? 1 : 0;
    else if (is("store")) {
        AnyDict dict;
        storeSettings(dict);
        value = dict;
    } else if (!qvGetParamRow<Settings>(rows, settings_, name, value))
        QvDecodePipe::getParam(name, value);
}

void RawDecoder::storeSettings(AnyDict& dict) const {
    dict.set("FOURCC", Any(qvFourccText(extendedFOURCC_).data()));
    dict.set("width", Any(settings_.width));
    dict.set("height", Any(settings_.height));
    dict.set("framerate", Any(settings_.framerate));
    dict.set("frameAspect", Any(settings_.frameAspect));
    dict.set("invert", Any(settings_.invert ? 1 : 0));
    dict.set("fieldOrderFile", Any(settings_.fieldOrderFile ? 1 : 0));
    dict.set("offset", Any(settings_.offset));
}

int RawDecoder::restore(const AnyDict& state) {
    if (const int result = QvDecodePipe::restore(state); result != QvStatus::ok) return result;
    AnyDict known;
    storeSettings(known);
    int result = QvStatus::ok;
    for (const auto [key, ignored] : known)
        if (state.isSet(key)) result |= setParam(key, state.get(key));
    return result == QvStatus::ok ? QvStatus::ok : QvStatus::failed;
}

// --- Opening.

int RawDecoder::open() {
    if (getState() == stateOpen) close();
    if (getState() != stateInitialised) return setError(QvStatus::failed, "Codec not inited");
    if (!source_ && (!filename_.isText() || filename_.size() == 0))
        return setError(QvStatus::failed, "media dec: filename not set");
    if (!frame_.inited())
        return setError(QvStatus::failed, "Invalid frame size %dx%d", settings_.width, settings_.height);
    if (const int result = checkFields(); result != QvStatus::ok) return result;
    if (const int result = makeConverter(); result != QvStatus::ok) return result;
    if (file_.open(filename_, readAhead, source_) != QvStatus::ok)
        return setError(QvStatus::failed, "Can not open file%s", file_.problem().c_str());
    setState(stateOpen);
    seekable_ = false;
    if (const int result = rewind(); result != QvStatus::ok) {
        close();
        return result;
    }
    seekable_ = true;
    return QvDecodePipe::open();
}

int RawDecoder::close() {
    file_.close();
    converter_.reset();
    pending_ = false;
    seekable_ = false;
    selected_ = false;
    return getState() == stateOpen ? QvDecodePipe::close() : QvStatus::ok;
}

// --- The stream.

long long RawDecoder::frameBytes() const {
    if (!frame_.inited()) return 0;
    switch (fileFormat_) {
        case FileFormat::rgb48: return 2LL * frame_.total_bytes();
        case FileFormat::rgbUnpadded: return 3LL * settings_.width * settings_.height;
        case FileFormat::plain:
        case FileFormat::v210: break;
    }
    return frame_.total_bytes();
}

long long RawDecoder::payload() const { return std::max(file_.length() - settings_.offset, 0LL); }

double RawDecoder::frameAspect() const {
    if (settings_.frameAspect > 0) return settings_.frameAspect;
    return static_cast<double>(settings_.width) / settings_.height;
}

int RawDecoder::nrStreams(int type) const {
    return getState() == stateOpen && qvStreamTypeMatches(qvVideoStream, type) ? 1 : 0;
}

int RawDecoder::nrFrames(int stream) const {
    if (stream != 0 || frameBytes() == 0) return 0;
    return static_cast<int>(std::min<long long>(payload() / frameBytes(), std::numeric_limits<int>::max()));
}

void RawDecoder::getStreamParams(int type, int stream, AnyDict& params) const {
    params.clear();
    if (type == qvVideoStream && stream == 0 && frame_.inited()) describe(params);
}

void RawDecoder::describe(AnyDict& params) const {
    const int frames = nrFrames(0);
    const double rate = settings_.framerate.rate();
    const bool v210 = fileFormat_ == FileFormat::v210;
    params.set("FOURCC", Any(static_cast<int>(v210 ? deliveredForV210 : fourcc_)));
    params.set("width", Any(settings_.width));
    params.set("height", Any(settings_.height));
    params.set("framerate", Any(settings_.framerate));
    params.set("frameAspect", Any(frameAspect()));
    params.set("pixelAspect", Any(frameAspect() * settings_.height / settings_.width));
    params.set("frames", Any(frames));
    params.set("duration", Any(frames / rate));
    params.set("codec", Any(qvFourccText(extendedFOURCC_).data()));
    params.set("videoCodec", Any(qvFourccText(extendedFOURCC_).data()));
    params.set("vBitrate", Any(static_cast<double>(frameBytes()) * 8 * rate));
    params.set("nrViews", Any(1));
    params.set("pal", Any(settings_.framerate.isPAL() ? 1 : 0));
    if (payload() % frameBytes() == 0) return;
    params.set("truncated", Any(1));
    params.set("framesExpected", Any(frames + 1LL));
}

int RawDecoder::select(int type, int stream) {
    if (type != qvVideoStream || stream != 0) return setError(QvStatus::failed, "Invalid stream nr");
    selected_ = true;
    return QvStatus::ok;
}

int RawDecoder::deselect(int type, int stream) {
    if (type != qvVideoStream || stream != 0) return setError(QvStatus::failed, "Invalid stream nr");
    selected_ = false;
    return QvStatus::ok;
}

int RawDecoder::selected(AnyDict& dict) const {
    AnyVector numbers;
    if (selected_) numbers.append(Any(0));
    dict.set("video", numbers);
    dict.set("audio", AnyVector());
    return QvStatus::ok;
}

bool RawDecoder::isSelected(int type, int stream) const {
    return type == qvVideoStream && stream == 0 && selected_;
}

QvFrame* RawDecoder::getFramePtr(int stream) {
    if (stream != 0) return nullptr;
    return converter_ ? converterFilter()->frame() : &frame_;
}

// --- No sound.

long long RawDecoder::nrSamples(int) const { return 0; }

QvPcm* RawDecoder::getAudioPtr(int) { return nullptr; }

int RawDecoder::readSamples(int, int) { return setError(QvStatus::notSupported, "Invalid stream nr"); }

int RawDecoder::seekToSample(long long, int) { return setError(QvStatus::notSupported, "Invalid stream nr"); }

// --- Reading.

int RawDecoder::refuse(int stream) {
    if (getState() != stateOpen) return setError(QvStatus::failed, "stream not opened");
    return stream == 0 ? QvStatus::ok : setError(QvStatus::failed, "Invalid stream nr");
}

int RawDecoder::readFailed() {
    return setError(QvStatus::failed, "fread() failed%s", file_.problem().c_str());
}

int RawDecoder::readFrame(int stream) {
    if (const int result = refuse(stream); result != QvStatus::ok) return result;
    if (std::exchange(pending_, false)) return QvStatus::ok;
    if (frameNr_ + 1 >= nrFrames(0)) return QvStatus::endOfStream;
    return readNext();
}

int RawDecoder::seekToFrame(long long frame, int stream) {
    if (const int result = refuse(stream); result != QvStatus::ok) return result;
    if (frame < 0 || frame >= nrFrames(0)) return setError(QvStatus::failed, "Invalid seek pos");
    if (!file_.seek(frameBytes() * frame + settings_.offset))
        return setError(QvStatus::failed, "Invalid seek pos%s", file_.problem().c_str());
    frameNr_ = static_cast<int>(frame) - 1;
    pending_ = false;
    const int result = readNext();
    pending_ = result == QvStatus::ok;
    return result;
}

int RawDecoder::readNext() {
    if (const int result = checkFields(); result != QvStatus::ok) return result;
    if (isFieldFile()) {
        for (QvFrame& field : fields_)
            if (const int result = readImage(field); result != QvStatus::ok) return result;
        const int top = settings_.framerate.isTopFirst() ? 0 : 1;
        if (const int result = frame_.interlace(fields_[top], fields_[1 - top]); result != QvStatus::ok)
            return setError(result, "top and bottom fields different");
    } else if (const int result = readImage(frame_); result != QvStatus::ok) {
        return result;
    }
    ++frameNr_;
    frame_.frameNr = frameNr_;
    frame_.framerate = settings_.framerate;
    return converter_ ? convert() : QvStatus::ok;
}

int RawDecoder::readImage(QvFrame& to) {
    switch (fileFormat_) {
        case FileFormat::rgb48:
        case FileFormat::rgbUnpadded: return readPacked(to);
        case FileFormat::plain:
        case FileFormat::v210: break;
    }
    if (settings_.invert) return readRows(to);
    const auto bytes = static_cast<std::size_t>(to.total_bytes());
    return file_.read(to.plane(0), 1, bytes) == bytes ? QvStatus::ok : readFailed();
}

// The file's first row becomes the last one of its plane.
int RawDecoder::readRows(QvFrame& to) {
    for (int plane = 0; plane < to.planes(); ++plane) {
        const auto rowBytes = static_cast<std::size_t>(to.stride(plane));
        const int rows = to.plane_bytes(plane) / to.stride(plane);
        unsigned char* row = to.plane(plane, true);
        for (int y = 0; y < rows; ++y, row += to.stride(plane, true))
            if (file_.read(row, 1, rowBytes) != rowBytes) return readFailed();
    }
    return QvStatus::ok;
}

// BGR3 frames from pixels of three bytes without padding of rows, or of 16-bit components with it.
int RawDecoder::readPacked(QvFrame& to) {
    const bool deep = fileFormat_ == FileFormat::rgb48;
    const int rowBytes = deep ? to.stride(0) : 3 * to.width(0);
    const std::size_t fileRow = static_cast<std::size_t>(rowBytes) * (deep ? 2 : 1);
    const std::size_t bytes = fileRow * static_cast<std::size_t>(to.height(0));
    readBuffer_.resize(bytes);
    if (file_.read(readBuffer_.data(), 1, bytes) != bytes) return readFailed();
    const bool flip = settings_.invert;
    const unsigned char* from = readBuffer_.data();
    unsigned char* row = to.plane(0, flip);
    for (int y = 0; y < to.height(0); ++y, row += to.stride(0, flip), from += fileRow) {
        if (!deep)
            std::memcpy(row, from, fileRow);
        else
            for (int x = 0; x < rowBytes; ++x) row[x] = from[2 * x + 1];
    }
    return QvStatus::ok;
}

// The converted frame stays in the converter, where getFramePtr finds it, until the next one.
int RawDecoder::convert() {
    QvVideoFilter& filter = *converterFilter();
    if (filter.ready()) filter.next();
    if (const int result = filter.write(frame_); result != QvStatus::ok)
        return setError(result, "%s", filter.errorDesc());
    return filter.ready() ? QvStatus::ok : setError(QvStatus::failed, "media dec: no converter for v210");
}

QvCodec* newRawdec() { return new RawDecoder; }

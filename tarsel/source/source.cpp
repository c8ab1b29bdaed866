#include "tarsel/source/source.h"

#include <algorithm>
#include <cstdio>
#include <new>

#include "tarsel/host/events.h"
#include "tarsel/host/files.h"
#include "tarsel/host/memory.h"
#include "tarsel/host/standardinput.h"
#include "tarsel/source/captionfile.h"
#include "tarsel/source/mixfile.h"
#include "tarsel/source/picturefile.h"
#include "tarsel/source/picturefiles.h"
#include "tarsel/source/viewfile.h"
#include "tarsel/source/wavformat.h"
#include "tarsel/words/keyvalues.h"
#include "tarsel/words/messages.h"
#include "tarsel/words/rawnames.h"
#include "tarsel/words/timespec.h"

namespace {

constexpr int kDecoder = 2;
constexpr int kSubpicture = 4;
constexpr const char* kGenerator = "testgen:";

// Every name that a raw format takes.
const std::vector<std::string> kRawKeys = {"size",       "pixel",  "rate",   "offset",
                                           "interlaced", "invert", "aspect", "fields"};
const std::vector<std::string> kGeneratorKeys = {"size", "rate",  "duration", "views",
                                                 "mode", "audio", "aspect",   "picture"};

double parseAspect(const std::string& text, const std::string& option) {
    const size_t colon = text.find(':');
    if (colon == std::string::npos) return static_cast<double>(parseNumber(text, 1, 100, option));
    return static_cast<double>(parseNumber(text.substr(0, colon), 1, 10000, option)) /
           static_cast<double>(parseNumber(text.substr(colon + 1), 1, 10000, option));
}

}  // namespace

void requireFrame(const std::string& option, unsigned fourcc, int width, int height) {
    QvFrame shape, frame;
    unsigned char place = 0;  // for the shape alone: nothing is allocated or touched
    if (shape.init(fourcc, width, height, &place) != QvStatus::ok)
        throw failure(Msg::frameTooLarge, {option, std::to_string(width) + "x" + std::to_string(height)});
    if (frame.init(fourcc, width, height) != QvStatus::ok) throw failure(Msg::outOfMemory);
}

std::vector<std::string> engineWarnings() {
    std::vector<std::string> texts;
    AnyVector messages;
    qv_log()->getAll(messages);
    for (const Any& message : messages)
        if (message.asDict().getInt32("type", 0) == QvLogMask::warning)
            texts.emplace_back(message.asDict().getString("text", ""));
    qv_log()->clear();
    return texts;
}

int printWarnings() {
    std::vector<std::string> lines;
    for (const std::string& text : engineWarnings())
        if (const std::string line = lineOf(Msg::engineWarns, {text});
            std::find(lines.begin(), lines.end(), line) == lines.end())
            lines.push_back(line);
    for (const auto& line : lines) tell(Level::warning, line);
    return static_cast<int>(lines.size());
}

int printConcealed(const Source& source) {
    const std::string text = source.concealed();
    if (text.empty()) return 0;
    tell(Level::warning, lineOf(Msg::filmConcealed, {source.name(), text}));
    return 1;
}

std::vector<std::string> moduleNames(int kind) {
    std::vector<std::string> names;
    const AnyVector modules = qv_registry()->modules(kind);
    names.reserve(static_cast<size_t>(modules.size()));
    for (int i = 0; i < modules.size(); ++i) names.push_back(modules.at(i).asDict().getString("name", ""));
    return names;
}

int moduleKind(const QvModule& module) {
    constexpr int kVideoFilter = 12, kAudioFilter = 13;
    const int kind = module.getAttr("type").toInt32();
    if (kind != kVideoFilter) return kind;
    const std::unique_ptr<QvCodec> codec(qv_registry()->newCodec(module.name()));
    return codec && codec->getInterface(kAudioFilter) ? kAudioFilter : kind;
}

std::unique_ptr<QvCodec> makeAnyCodec(const std::string& module, int kind) {
    const QvModule* found = qv_registry()->module(module.c_str());
    if (!found || moduleKind(*found) != kind)
        throw failure(Msg::moduleUnknown, {module, suggestion(module, moduleNames(kind))});
    const MemoryWatch memory;
    std::unique_ptr<QvCodec> codec(qv_registry()->newCodec(module.c_str()));
    if (!codec && memory.ranOut()) throw std::bad_alloc();
    if (!codec) throw failure(Msg::moduleUnusable, {module});
    return codec;
}

namespace {

std::vector<std::string> parameterNames(const QvCodec& codec) {
    std::vector<std::string> names;
    for (const Any& row : qvParameters(codec))
        if (const std::string name = row.asDict().getString("name", "_"); name[0] != '_')
            names.push_back(name);
    return names;
}

}  // namespace

void setChecked(QvCodec& codec, const std::string& name, const Any& value, const std::string& what) {
    int result = QvStatus::invalidParam;
    try {
        result = codec.setParam(name.c_str(), value);
    } catch (const QvParamException&) {
        throw failure(Msg::parameterUnknown,
                      {what, codec.name(), name, suggestion(name, parameterNames(codec)), codec.name()});
    }
    if (result == QvStatus::ok) return;
    const std::string reason = codec.errorDesc();
    throw failure(Msg::parameterRefused, {what, name, reason.empty() ? "it is not in its range" : reason});
}

bool Source::isGenerator(const std::string& spec) {
    return spec.rfind(kGenerator, 0) == 0 || spec == "testgen";
}

AnyDict stateOf(const QvCodec& codec) {
    AnyDict state;
    codec.store(state);
    state.set("_on", 1);
    return state;
}

Source::Source(const std::string& spec, const std::string& raw, StandardInput* standard, const Films& films)
    : name_(spec), formatName_(spec) {
    if (isGenerator(spec)) {
        isFile_ = false;
        if (!raw.empty()) throw failure(Msg::rawNoFile, {spec});
        openGenerator(spec);
    } else if (spec == StandardInput::kName) {
        takeStandard(standard, !raw.empty());
        raw.empty() ? openFile(films) : openRaw(raw);
    } else if (raw.empty() && isCardFolder(spec)) {
        decoder_ = openCard(spec);
        name_ = decoder_->QvCodec::getParam("filename").toString().asString("");
        files_.push_back(name_);
    } else {
        if (const auto pictures = pictureFiles(spec)) takePictures(*pictures, raw);
        files_.push_back(name_);
        requireInput(name_);
        raw.empty() || pictures_.isSet("pictures") ? openFile(films) : openRaw(raw);
    }
    open_ = decoder_.get();
    takeMixed();
}

Source::Source(const std::string& name, QvDecodePipe& decoder)
    : name_(name), isFile_(false), open_(&decoder) {}

Source::Source(QvDecodePipe& decoder) : open_(&decoder) {
    name_ = decoder.QvCodec::getParam("filename").toString().asString("");
    isFile_ = !decoder.QvCodec::getParam("isMeta").isTrue();
    if (isFile_) files_.push_back(name_);
    takeMixed();
}

Source::Source(const std::string& name, std::unique_ptr<QvDecodePipe> decoder)
    : name_(name), isFile_(false), decoder_(std::move(decoder)), open_(decoder_.get()) {}

void Source::takeStandard(StandardInput* standard, bool isRaw) {
    if (!standard) throw failure(Msg::stdinNotTaken, {name_});
    const std::string& format = standard->format();
    if (format.empty() && !isRaw) throw failure(Msg::stdinNoFormat, {name_});
    if (!format.empty()) formatName_ += "." + format;
    if (isMixName(formatName_) || QvFile::getExt(Any(formatName_.c_str()), true) == "xml")
        throw failure(Msg::stdinIsDocument, {"--input-format " + format});
    isFile_ = false;
    standard->take();
    standard_ = standard;
    if (!standard->file().empty()) files_.push_back(standard->file());
}

bool Source::describesItself(const std::string& spec) {
    if (isGenerator(spec)) return true;
    const Any ext = QvFile::getExt(Any(spec.c_str()), true);
    return !qv_registry()->decoders(ext.asString()).empty();
}

// The first of them stands for all.
void Source::takePictures(const PictureFiles& pictures, const std::string& raw) {
    name_ = formatName_ = pictures.first;
    pictures_ = AnyDict("pictures", pictures.count);
    if (raw.empty()) return;
    const KeyValues keys(raw, {"rate"}, "--raw");
    if (const std::string* rate = keys.find("rate"))
        pictures_.set("framerate", Any(parseRate(*rate, "--raw rate")));
}

void Source::refuse(const std::string& why) const { throw failure(Msg::inputRefused, {name_, why}); }

void Source::openGenerator(const std::string& spec) {
    const std::string option = "testgen";
    const size_t colon = spec.find(':');
    const KeyValues keys(colon == std::string::npos ? "" : std::string_view(spec).substr(colon + 1),
                         kGeneratorKeys, option);
    const auto value = [&](const char* key, const char* otherwise) {
        const std::string* given = keys.find(key);
        return given ? *given : std::string(otherwise);
    };
    const Size size = parseSize(value("size", "1280x720"), option + ": size");
    if (size.width < 32 || size.height < 32) throw failure(Msg::generatorSmall, {value("size", "")});
    requireFrame(option + ": size", QvFourcc::BGR4, size.width, size.height);
    const QvFramerate rate = parseRate(value("rate", "25"), option + ": rate");
    const MediaTime duration = parseTime(value("duration", "10"), rate, option + ": duration");
    if (duration.position(rate) < 1) throw failure(Msg::generatorNoFrame, {value("duration", "10")});

    AnyDict video, audio, streams;
    video.set("width", size.width);
    video.set("height", size.height);
    video.set("framerate", Any(rate));
    video.set("duration", Any(duration));
    if (const std::string* views = keys.find("views"))
        video.set("nrViews", static_cast<int>(parseNumber(*views, 1, 10, option + ": views")));
    if (const std::string* aspect = keys.find("aspect"))
        video.set("frameAspect", parseAspect(*aspect, option + ": aspect"));
    if (const std::string* picture = keys.find("picture")) {
        requirePicture(*picture);
        video.set("picture", picture->c_str());
        files_.push_back(*picture);
    }
    audio.set("duration", Any(duration));
    AnyVector vids, auds;
    vids.append(video);
    if (parseNumber(value("audio", "1"), 0, 1, option + ": audio")) auds.append(audio);
    streams.set("vids", vids);
    streams.set("auds", auds);

    decoder_ = makeCodec<QvDecodePipe>("testgen", kDecoder);
    if (const std::string* mode = keys.find("mode")) {
        if (*mode != "graybar" && *mode != "card")
            throw failure(Msg::nameUnknown, {option + ": mode", "mode", *mode, "", "card or graybar"});
        decoder_->setParam("mode", mode->c_str());
    }
    decoder_->setParam("streams", streams);
    if (decoder_->open() != QvStatus::ok) throw failure(Msg::generatorFailed, {name_, decoder_->errorDesc()});
}

void Source::openRaw(const std::string& raw) {
    const std::string option = "--raw";
    const KeyValues keys(raw, kRawKeys, option);
    const std::string *size = keys.find("size"), *pixel = keys.find("pixel"), *rate = keys.find("rate");
    const std::string extension = extensionOf(formatName_);
    const RawName* name = rawName(extension);
    if (!size || (!pixel && !openName(extension) && (!name || name->fourcc == 0)))
        throw failure(Msg::rawIncomplete);
    if (!pixel && openName(extension)) throw failure(Msg::rawNameOpen, {name_});
    decoder_ = makeCodec<QvDecodePipe>("rawdec", kDecoder);
    QvDecodePipe& d = *decoder_;
    const Size dimensions = parseSize(*size, option + " size");
    const unsigned fourcc = pixel ? parsePixel(*pixel, option + " pixel") : name->fourcc;
    if (name && !nameAllows(*name, fourcc, true))
        throw failure(Msg::rawNameSays, {*pixel, name_, fourccText(name->fourcc)});
    requireFrame(option + " size", fourcc, dimensions.width, dimensions.height);
    setChecked(d, "filename", formatName_.c_str(), option);
    if (standard_) {
        bytes_ = standard_->source();
        setChecked(d, qvSourceParam, qvSourceValue(bytes_.get()), option);
    }
    setChecked(d, "FOURCC", static_cast<int>(fourcc), option + " pixel");
    setChecked(d, "width", dimensions.width, option + " size");
    setChecked(d, "height", dimensions.height, option + " size");
    QvFramerate framerate = parseRate(rate ? *rate : "25", option + " rate");
    if (const auto* order = keys.find("interlaced")) {
        const int asked = static_cast<int>(parseNumber(*order, 0, 2, option + " interlaced"));
        const int said = framerate.interlaced();
        if (said != 0 && said != asked)
            throw failure(Msg::optionsExclude, {option + " interlaced=" + *order, option + " rate=" + *rate});
        framerate.setInterlaced(asked);
        if (said == 0) requireFrames(framerate, rate ? *rate : "25", option + " rate");
    }
    setChecked(d, "framerate", Any(framerate), option + " rate");
    if (const auto* offset = keys.find("offset"))
        setChecked(d, "offset", parseNumber(*offset, 0, 1LL << 62, option + " offset"), option + " offset");
    if (const auto* invert = keys.find("invert"))
        setChecked(d, "invert", static_cast<int>(parseNumber(*invert, 0, 1, option + " invert")),
                   option + " invert");
    if (const auto* fields = keys.find("fields"))
        setChecked(d, "fieldOrderFile", static_cast<int>(parseNumber(*fields, 0, 1, option + " fields")),
                   option + " fields");
    if (const auto* aspect = keys.find("aspect"))
        setChecked(d, "frameAspect", parseAspect(*aspect, option + " aspect"), option + " aspect");
    if (d.open() != QvStatus::ok) refuse(d.errorDesc());
    if (d.nrFrames(0) == 0) throw failure(Msg::rawTooShort, {name_, *size, fourccText(fourcc)});
}

namespace {

bool isCaptionFile(const std::string& name) {
    const Any ext = QvFile::getExt(Any(name.c_str()), true);
    return ext == "scc" || ext == "sc2";
}

// With which a file is opened; invalid for none. Half of all caption files are written in drop frame.
Any openParameters(const std::string& name) {
    if (isCaptionFile(name)) return AnyDict("dropFrameLines", 1);
    if (QvFile::getExt(Any(name.c_str()), true) == "wav") return AnyDict("extended", 1);
    return Any();
}

}  // namespace

std::string Source::head(size_t most) const {
    return standard_ ? standard_->firstBytes(most) : firstBytes(name_, most);
}

// Why the best decoder refuses it. The factory keeps only the name of a file, so that one is asked once more.
void Source::refuseFile(const std::string& decoder, const std::string& reason) const {
    std::string why = reason;
    if (!standard_) {
        const std::unique_ptr<QvCodec> codec(qv_registry()->newCodec(decoder.c_str()));
        if (!codec) throw failure(Msg::inputNoDecoder, {name_});
        if (decoder == "sccdec" || decoder == "wavdec")
            codec->setParam("openParameters", openParameters(name_));
        if (pictures_.isSet("pictures") && decoder == "avdec") codec->setParam("openParameters", pictures_);
        codec->setParam("filename", name_.c_str());
        if (codec->open() != QvStatus::ok) why = codec->errorDesc();
    }
    head(1);  // a disk that fails is no fault of the format
    if (decoder == "wavdec") refuseWav(name_, head(kWavHead));
    if (decoder == "sccdec") refuseScc(name_, head(kSccHead));
    const Any ext = QvFile::getExt(Any(formatName_.c_str()), true);
    if (ext == "srt" || ext == "sub") throw failure(Msg::inputNoSubtitles, {name_});
    refuse(why.empty() ? "no decoder can read it" : why);
}

void Source::takeMixed() {
    requireMixed(name_, *open_);
    for (const std::string& file : mixedFiles(*open_)) files_.push_back(file);
    for (const std::string& file : inputFilesOf(*open_)) files_.push_back(file);
}

void Source::openFile(const Films& films) {
    if (isMixName(formatName_)) decoder_ = openViews(name_);
    if (!decoder_ && isMixName(formatName_)) decoder_ = openMix(name_);
    if (decoder_) return;
    Any params = openParameters(formatName_);
    if (isFilm(formatName_))
        params = AnyDict("upright", films.upright ? 1 : 0, "exact", films.exact ? 1 : 0, "survey",
                         films.survey ? 1 : 0);
    if (pictures_.isSet("pictures")) {
        params = pictures_;
        params.asDict().set("upright", films.upright ? 1 : 0);
    }
    Any error;
    if (standard_) {
        requireDecoder();
        AnyDict given;
        if (params.isValid()) given.set("openParameters", params);
        decoder_.reset(
            QvDecFactory::decodeSource(standard_->source(), Any(formatName_.c_str()), given, &error));
    } else {
        decoder_.reset(QvDecFactory::decodePipe(Any(name_.c_str()), Any(), nullptr,
                                                params.isValid() ? &params : nullptr));
    }
    if (decoder_) return;
    if (isMixName(formatName_)) readMix(name_);  // which refuses it
    refuseFile(requireDecoder(), error.asString(""));
}

// The best decoder for its extension.
std::string Source::requireDecoder() const {
    const Any ext = QvFile::getExt(Any(formatName_.c_str()), true);
    const AnyVector candidates = qv_registry()->decoders(ext.asString());
    if (!candidates.empty()) return candidates.at(0).asString();
    const std::unique_ptr<AnyVector> exts(qv_registry()->inputExts(false, false));
    for (int i = 0; i < exts->size(); ++i)
        if (exts->at(i) == ext) throw failure(Msg::inputIsRaw, {name_});
    if (rawName(ext.asString("")) || openName(ext.asString(""))) throw failure(Msg::inputIsRaw, {name_});
    throw failure(Msg::inputUnknown, {name_, ext.asString()});
}

std::string Source::decoderName() const {
    if (!standard_) return open_->name();
    // What reads bytes of memory names the decoder that it has made.
    const Any inner = open_->QvCodec::getParam("decoder");
    return inner.isText() ? inner.toString().asString("") : open_->name();
}

long long Source::bytes() const {
    if (standard_) return standard_->bytes();
    if (!isFile_) return -1;
    // A document that names other files stands for them.
    const Any all = open_->QvCodec::getParam("filesize");
    return std::max(fileBytes(name_), all.isInt() ? all.toInt64() : 0);
}

std::optional<QvFramerate> Source::frameRate() const {
    if (open_->nrStreams(1) == 0) return std::nullopt;
    const Any rate = open_->getVideoParam(0, "framerate");
    if (!rate.isFramerate()) return std::nullopt;
    return rate.asFramerate();
}

double Source::duration() const {
    double longest = -1;
    for (int type : {1, 2})
        for (int i = 0; i < open_->nrStreams(type); ++i) {
            const Any seconds = open_->getStreamParam(type, i, "duration");
            if (seconds.isDouble()) longest = std::max(longest, seconds.asDouble());
        }
    if (open_->nrStreams(1) + open_->nrStreams(2) > 0) return longest;
    for (int i = 0; i < open_->nrStreams(kSubpicture); ++i)
        longest = std::max(longest, open_->duration(kSubpicture, i).seconds());
    return longest;
}

void Source::selectAll() {
    for (int type : {1, 2})
        for (int i = 0; i < open_->nrStreams(type); ++i)
            if (open_->select(type, i) != QvStatus::ok)
                throw failure(Msg::streamRefused, {name_, type == 1 ? "video" : "audio", std::to_string(i)});
}

std::string Source::concealed() const {
    std::string text;
    for (int type : {1, 2}) {
        long long count = 0;
        for (int i = 0; i < open_->nrStreams(type); ++i) {
            AnyDict params;
            open_->getStreamParams(type, i, params);
            if (open_->isSelected(type, i)) count += params.getInt64("concealed", 0);
        }
        if (count == 0) continue;
        if (!text.empty()) text += " and ";
        text += std::to_string(count) + (type == 1 ? " picture" : " packet") + (count == 1 ? "" : "s") +
                (type == 1 ? "" : " of sound");
    }
    return text;
}

std::string Source::damage() const {
    if (const std::string mixed = mixDamage(*open_); !mixed.empty()) return mixed;
    for (int i = 0; i < open_->nrStreams(kSubpicture); ++i)
        if (const long long bytes = open_->getStreamParam(kSubpicture, i, "unread").asInt64(0); bytes > 0)
            return "the last " + std::to_string(bytes) + " bytes of its text can't be read";
    for (int type : {1, 2})
        for (int i = 0; i < open_->nrStreams(type); ++i) {
            AnyDict params;
            open_->getStreamParams(type, i, params);
            if (!params.get("truncated").isTrue()) continue;
            const bool video = type == 1;
            const long long present = video ? open_->nrFrames(i) : open_->nrSamples(i);
            const long long expected = params.getInt64(video ? "framesExpected" : "samplesExpected", present);
            if (const long long lost = params.getInt64("framesLost", 0); lost > 0)
                return std::to_string(lost) + " of its pictures are missing";
            // Others lack whole frames.
            if (video && decoderName() == "rawdec" && expected == present + 1)
                return "it ends in the middle of frame " + std::to_string(expected) + ", after " +
                       std::to_string(present) + " whole ones";
            return "it ends after " + std::to_string(present) + " of " + std::to_string(expected) +
                   (video ? " frames" : " samples");
        }
    return "";
}

#include "tarsel/picture/picture.h"

#include <algorithm>
#include <cstring>
#include <new>

#include "tarsel/host/files.h"
#include "tarsel/host/memory.h"
#include "tarsel/picture/overlays.h"
#include "tarsel/picture/sizes.h"
#include "tarsel/source/setting.h"
#include "tarsel/words/keyvalues.h"
#include "tarsel/words/messages.h"
#include "tarsel/words/rawnames.h"
#include "tarsel/words/timespec.h"
#include "tarsel/words/valuetext.h"

namespace {

constexpr int kVideo = 1, kAudio = 2;
constexpr int kVideoFilter = 12, kAudioFilter = 13, kVideoEncoder = 7;
constexpr int kLeastPart = 4;  // pixels of a side that --fit has to leave

// The format in which the encoder of an output wants its frames; BGR3 if it can't write that output.
unsigned frameFormat(unsigned fourcc) {
    const auto encoder = makeAnyCodec("rawvenc", kVideoEncoder);
    try {
        if (encoder->setParam("type", static_cast<int>(fourcc)) == QvStatus::ok)
            return static_cast<unsigned>(
                encoder->getParam("selectedFOURCC").asInt32(static_cast<int>(fourcc)));
    } catch (const QvException&) {
    }
    return QvFourcc::BGR3;
}

AnyDict scalerState(int width, int height, unsigned fourcc) {
    const auto scaler = makeAnyCodec("scaler", kVideoFilter);
    setChecked(*scaler, "outWidth", width, "--size");
    setChecked(*scaler, "outHeight", height, "--size");
    setChecked(*scaler, "FOURCC", static_cast<int>(fourcc), "--pixel");
    return stateOf(*scaler);
}

std::string filterName(const std::string& spec) { return spec.substr(0, spec.find(':')); }

// Custom filters stand in the order of their positions.
void append(FiltersState& state, AnyDict filter, bool front) {
    filter.set("_front", front ? 1 : 0);
    filter.set("_position", state.count() + 1);
    state.appendFilter(filter.getString("name", ""), filter);
}

int intParam(const QvDecodePipe& decoder, int stream, const char* name) {
    return decoder.getStreamParam(kVideo, stream, name).asInt32(0);
}

int matrixNumber(std::string_view text, const std::string& all) {
    if (text == "601") return 1;
    if (text == "709") return 2;
    throw failure(Msg::matrixWrong, {all});
}

}  // namespace

int filterType(const std::string& spec) {
    const std::string name = filterName(spec);
    const QvModule* module = qv_registry()->module(name.c_str());
    const int kind = module ? moduleKind(*module) : 0;
    if (kind == kVideoFilter) return kVideo;
    if (kind == kAudioFilter) return kAudio;
    std::vector<std::string> known = moduleNames(kVideoFilter);
    for (const auto& audio : moduleNames(kAudioFilter)) known.push_back(audio);
    throw failure(Msg::filterUnknown, {name, suggestion(name, known)});
}

AnyDict filterState(const std::string& spec) {
    const std::string name = filterName(spec), option = "--filter " + name;
    const auto filter = makeAnyCodec(name, filterType(spec) == kVideo ? kVideoFilter : kAudioFilter);
    const KeyValues keys(name.size() == spec.size() ? "" : spec.substr(name.size() + 1), {}, option);
    for (const auto& [key, value] : keys.all()) setGuessed(*filter, key, value, option);
    // Two frames of each interlaced one are made first, so that scaling and a further change of the rate work
    // on whole pictures.
    if (filter->getParam("_rateFactor").asInt32(1) > 1 && !keys.find("_front")) filter->setParam("_front", 1);
    return stateOf(*filter);
}

double PictureFormat::pixelAspect() const {
    const double ratio = aspect * height / std::max(width, 1);
    return ratio < 0.1 || ratio > 10 || std::abs(ratio - 1) < 0.01 ? 1 : ratio;
}

// --- The plan of a picture.

PictureFormat pictureFormat(const Source& source, int stream) {
    const QvDecodePipe& decoder = source.decoder();
    PictureFormat format;
    format.width = intParam(decoder, stream, "width");
    format.height = intParam(decoder, stream, "height");
    format.fourcc = static_cast<unsigned>(intParam(decoder, stream, "FOURCC"));
    const Any rate = decoder.getStreamParam(kVideo, stream, "framerate");
    if (rate.isFramerate()) format.rate = rate.asFramerate();
    const Any aspect = decoder.getStreamParam(kVideo, stream, "frameAspect");
    format.aspect = aspect.isDouble() && aspect.asDouble() > 0
                        ? aspect.asDouble()
                        : static_cast<double>(format.width) / std::max(format.height, 1);
    format.colours = {intParam(decoder, stream, "colourPrimaries"),
                      intParam(decoder, stream, "colourTransfer"), intParam(decoder, stream, "colourSpace")};
    return format;
}

PictureEffects::PictureEffects(const EffectOptions& options, const PictureFormat& in, bool toPng)
    : options_(options), in_(in), out_(in) {
    planDeinterlace();
    planCrop();
    planRate();
    if (!options_.pixel.empty()) out_.fourcc = parsePixel(options_.pixel, "--pixel");
    planMatrix(toPng);
    planSize();
    if (options_.subtitles.empty() && !options_.subtitleStyle.empty()) throw failure(Msg::styleAlone);
}

void PictureEffects::planDeinterlace() {
    const int order = in_.rate.interlaced();
    if (options_.flip && order && in_.height % 2 == 0) out_.rate.setInterlaced(3 - order);
    if (options_.deinterlace.empty()) return;
    deinterlace_ = options_.deinterlace == "true" ? "top" : options_.deinterlace;
    const std::vector<std::string>& known = deinterlaceMethods();
    if (std::find(known.begin(), known.end(), deinterlace_) == known.end())
        throw failure(Msg::nameUnknown, {"--deinterlace", "method", deinterlace_,
                                         suggestion(deinterlace_, known), joined(known)});
    if (order == 0) throw failure(Msg::deinterlaceProgressive);
    if (deinterlace_ == "reverse") {
        out_.rate.setInterlaced(3 - out_.rate.interlaced());
        return;
    }
    out_.rate.setInterlaced(0);
    if (deinterlace_ == "double")
        out_.rate = QvFramerate(QvRatio(in_.rate.rate().num * 2, in_.rate.rate().den));
}

void PictureEffects::planRate() {
    if (options_.rate.empty()) return;
    const double before = static_cast<double>(out_.rate.rate());
    out_.rate = parseRate(options_.rate, "--rate");
    const double after = static_cast<double>(out_.rate.rate());
    const auto converts = [](double fps) { return fps > 0.1 && fps <= 120; };
    if (before == after || (converts(before) && converts(after))) return;
    char from[32], to[32];
    std::snprintf(from, sizeof from, "%g", before);
    std::snprintf(to, sizeof to, "%g", after);
    throw failure(Msg::rateNotConverted, {from, to});
}

void PictureEffects::planCrop() {
    if (options_.crop.empty()) return;
    crop_ = parseCrop(options_.crop, in_);
    out_.width = crop_->width();
    out_.height = crop_->height();
    out_.aspect *= static_cast<double>(crop_->width()) / in_.width * in_.height / crop_->height();
}

void PictureEffects::planSize() {
    if (!options_.fit.empty()) planFit();
    if (!options_.size.empty()) {
        const Size size = scaledSize(options_.size, out_);
        out_.width = size.width;
        out_.height = size.height;
    }
    if (!options_.size.empty() || !options_.fit.empty())
        requireFrame(options_.fit.empty() ? "--size" : "--fit", frameFormat(out_.fourcc), out_.width,
                     out_.height);
}

// Bars and cuts are made on the picture before it is scaled, where the cropper stands.
void PictureEffects::planFit() {
    const Fit fit = parseFit(options_.fit);
    Size size = fit.box;
    PictureFormat part = in_;
    const QvRect kept = crop_.value_or(QvRect(0, 0, in_.width, in_.height));
    part.width = kept.width();
    part.height = kept.height();
    part.aspect = out_.aspect;
    if (fit.how == Fit::How::within) {
        size = sizeWithin(fit.box, out_);
    } else if (fit.how == Fit::How::crop) {
        const QvRect cut = partOfShape(fit.aspect(), part);
        if (cut.width() < kLeastPart || cut.height() < kLeastPart) throw failure(Msg::fitFar, {options_.fit});
        if (crop_ || cut.width() != part.width || cut.height() != part.height)
            crop_ = QvRect(kept.left() + cut.left(), kept.top() + cut.top(), kept.left() + cut.right(),
                           kept.top() + cut.bottom());
    } else {
        const Bars bars = barsAround(kept, part, fit, options_.fit);
        barColumns_ = bars.columns;
        barRows_ = bars.rows;
        if (bars.columns > 0 || bars.rows > 0) crop_ = kept;
    }
    if (fit.how != Fit::How::within) out_.aspect = fit.aspect();
    out_.width = size.width;
    out_.height = size.height;
}

// One matrix is that of the side that is YUV, and of the output if both are.
void PictureEffects::planMatrix(bool toPng) {
    const std::string& text = options_.matrix;
    if (text.empty()) return;
    const size_t colon = text.find(':');
    const int last =
        matrixNumber(std::string_view(text).substr(colon == std::string::npos ? 0 : colon + 1), text);
    if (toPng && options_.pixel.empty()) out_.fourcc = QvFourcc::BGR3;
    const bool yuvIn = isYuv(in_.fourcc), yuvOut = isYuv(out_.fourcc);
    if (!yuvIn && !yuvOut) throw failure(Msg::matrixNoYuv);
    if (colon != std::string::npos) {
        inMatrix_ = matrixNumber(std::string_view(text).substr(0, colon), text);
        outMatrix_ = last;
    } else {
        (yuvOut ? outMatrix_ : inMatrix_) = last;
    }
}

bool PictureEffects::needsAllFrames() const {
    return !options_.fade.empty() || !options_.filters.empty() || deinterlace_ == "double" ||
           !options_.rate.empty() || std::any_of(options_.logos.begin(), options_.logos.end(), logoIsMoving);
}

void PictureEffects::addFixed(FiltersState& state) const {
    if (options_.flip) {
        const auto flipper = makeAnyCodec("flipper", kVideoFilter);
        setChecked(*flipper, "flip", 1, "--flip");
        state.setFilter("flipper", stateOf(*flipper));
    }
    if (!deinterlace_.empty() && deinterlace_ != "double") {
        const auto filter = makeAnyCodec("deinterlace", kVideoFilter);
        setChecked(*filter, "deinterlace", deinterlace_.c_str(), "--deinterlace");
        state.setFilter("deinterlace", stateOf(*filter));
    }
    if (inMatrix_ || outMatrix_) {
        AnyDict scaler("_on", 1);
        if (inMatrix_) scaler.set("inITU", inMatrix_);
        if (outMatrix_) scaler.set("outITU", outMatrix_);
        state.set("scaler", scaler);
    }
    if (!crop_) return;
    const auto cropper = makeAnyCodec("cropper", kVideoFilter);
    const char* option = options_.crop.empty() ? "--fit" : "--crop";
    const auto set = [&](const char* name, const Any& value) { setChecked(*cropper, name, value, option); };
    set("inputWidth", in_.width);
    set("inputHeight", in_.height);
    set("mode", 1);
    set("cropBox", *crop_);
    for (const char* pad : {"padLeft", "padRight"})
        if (barColumns_ > 0) set(pad, barColumns_);
    for (const char* pad : {"padTop", "padBottom"})
        if (barRows_ > 0) set(pad, barRows_);
    if (cropper->getParam("outputWidth") != crop_->width() + 2 * barColumns_ ||
        cropper->getParam("outputHeight") != crop_->height() + 2 * barRows_)
        throw failure(Msg::cropRefused, {option, options_.crop.empty() ? options_.fit : options_.crop});
    state.setFilter("cropper", stateOf(*cropper));
}

void PictureEffects::addOptions(FiltersState& state, long long frames, bool alone) const {
    for (const auto& spec : options_.filters) {
        if (filterType(spec) != kVideo) continue;
        const AnyDict filter = filterState(spec);
        const std::string name = filter.getString("name", "");
        if ((name == "flipper" || name == "cropper" || name == "deinterlace") && state.isSet(name.c_str()))
            throw failure(Msg::filterPlaceTaken, {name});
        append(state, filter, filter.get("_front").isTrue());
    }
    for (const auto& logo : options_.logos) append(state, logoState(logo, out_), false);
    // Text has to be drawn on other frames than those of I422.
    const bool text = !options_.subtitles.empty() || !options_.timecode.empty();
    const bool apart = text && frameFormat(out_.fourcc) == QvFourcc::I422;
    if (apart) append(state, scalerState(out_.width, out_.height, QvFourcc::YUYV), false);
    if (!options_.subtitles.empty())
        append(state, subtitleState(options_.subtitles, options_.subtitleStyle, out_, options_.acceptPartial),
               false);
    if (!options_.fade.empty()) append(state, fadeState(options_.fade, out_, frames), false);
    if (!options_.timecode.empty())
        append(state, timecodeState(options_.timecode, out_, alone, !options_.subtitles.empty()), false);
    if (apart) append(state, scalerState(out_.width, out_.height, QvFourcc::I422), false);
}

FiltersState PictureEffects::filters(long long frames, bool alone) const {
    FiltersState state;
    if (deinterlace_ == "double") append(state, stateOf(*makeAnyCodec("bobber", kVideoFilter)), true);
    // The cropper has no hold on pixels that are packed by sixes.
    if (crop_ && in_.fourcc == QvFourcc::v210)
        append(state, scalerState(in_.width, in_.height, QvFourcc::Y216), true);
    addFixed(state);
    addOptions(state, frames, alone);
    return state;
}

VideoJobDescription PictureEffects::job(const FiltersState& filters) const {
    VideoJobDescription job;
    job.inWidth = in_.width;
    job.inHeight = in_.height;
    job.inFOURCC = in_.fourcc;
    job.inFramerate = in_.rate;
    job.inFrameAspect = in_.aspect;
    job.outWidth = out_.width;
    job.outHeight = out_.height;
    job.outFOURCC = frameFormat(out_.fourcc);
    job.outFramerate = out_.rate;
    job.filters = filters;
    return job;
}

// --- Pipes.

namespace {

// A sentence of the engine without a name that the line has already.
std::string without(std::string sentence, const std::string& name) {
    if (const size_t at = sentence.find(" " + name); at != std::string::npos)
        sentence.erase(at, name.size() + 1);
    return sentence;
}

// A sentence of the engine without the class in front ("QvScalerCC::") and its exclamation mark.
std::string withoutClass(std::string sentence) {
    const size_t name = sentence.find_first_of(" :");
    if (name != std::string::npos && sentence.compare(name, 2, "::") == 0) sentence.erase(0, name + 2);
    if (sentence.ends_with('!')) sentence.pop_back();
    return sentence;
}

// Opens a filter for a moment. One that writes a file would make it then, so it has to wait for the run.
void tryFilter(QvVideoFilter& filter) {
    if (const std::string written = filterFile(filter, QV_GUI_FILESELECT_SAVE); !written.empty()) {
        // A new one has a name that stands for none.
        const std::unique_ptr<QvCodec> fresh(qv_registry()->newCodec(filter.name()));
        if (fresh && filterFile(*fresh, QV_GUI_FILESELECT_SAVE) == written)
            throw failure(Msg::filterFileMissing, {filter.name()});
        return;
    }
    int result = QvStatus::failed;
    std::string reason;
    const MemoryWatch memory;
    try {
        result = filter.open();
        reason = filter.errorDesc();
        filter.close();
    } catch (const QvException& failure) {
        reason = failure.what();
    }
    if (result == QvStatus::ok) return;
    if (memory.ranOut()) throw std::bad_alloc();
    if (const std::string read = filterFile(filter, QV_GUI_FILESELECT_LOAD); !read.empty()) {
        requireFile(read);
        throw failure(Msg::filterFileRefused, {filter.name(), read, without(reason, read)});
    }
    throw failure(Msg::filterRefused, {filter.name(), withoutClass(reason)});
}

// What differs from the values that a filter begins with.
void addSettings(const AnyDict& state, const AnyDict& initial, std::string& line) {
    for (int i = 0; i < state.size(); ++i) {
        const std::string key = state.getKey(i);
        const Any& value = state.get(key.c_str());
        const Any& before = initial.get(key.c_str());
        if (key[0] == '_' || key == "name" || value == before) continue;
        if (value.isDict())
            addSettings(value.asDict(), before.isDict() ? before.asDict() : AnyDict(), line);
        else if (const std::string text = valueText(value); !text.empty())
            line.append(" ").append(key).append("=").append(text);
    }
}

}  // namespace

namespace {

// The parameters of a filter that are files of this kind and name one.
std::vector<std::string> fileParams(const QvCodec& filter, int guiControl) {
    std::vector<std::string> params;
    const Any set = filter.getParam("paramSet");
    for (int i = 0; set.isVector() && i < set.asVector().size(); ++i) {
        const AnyDict& described = set.asVector().at(i).asDict();
        if (described.getInt32("guiControl", 0) != guiControl) continue;
        const char* name = described.getString("name", "");
        const Any value = filter.getParam(name).toString();
        if (*value.asString("")) params.emplace_back(name);
    }
    return params;
}

}  // namespace

std::string filterFile(const QvCodec& filter, int guiControl) {
    const auto params = fileParams(filter, guiControl);
    if (params.empty()) return "";
    const Any value = filter.getParam(params.front().c_str()).toString();
    return value.asString("");
}

namespace {

// The parameters of a filter that name a file which it reads.
std::vector<std::string> filesRead(const QvCodec& filter) {
    auto params = fileParams(filter, QV_GUI_FILESELECT_LOAD);
    params.emplace_back("font_filename");  // which not every filter describes
    return params;
}

std::string textOf(const QvCodec& filter, const std::string& param) {
    const Any value = filter.getParam(param.c_str());
    return value.isText() ? value.toString().asString("") : "";
}

// What a new filter has stands for no file of the user's. True if another name was set.
bool changeFile(QvCodec& filter, const std::string& param, const QvCodec& fresh, bool writes,
                const OtherFile& other) {
    const std::string file = textOf(filter, param);
    if (file.empty() || file == textOf(fresh, param)) return false;
    const std::string name = other(file, filter.name(), writes);
    return name != file && filter.setParam(param.c_str(), name.c_str()) == QvStatus::ok;
}

bool changeFiles(QvCodec& filter, const OtherFile& other) {
    const std::unique_ptr<QvCodec> fresh(qv_registry()->newCodec(filter.name()));
    bool changed = false;
    for (const auto& param : filesRead(filter)) changed |= changeFile(filter, param, *fresh, false, other);
    for (const auto& param : fileParams(filter, QV_GUI_FILESELECT_SAVE))
        changed |= changeFile(filter, param, *fresh, true, other);
    return changed;
}

}  // namespace

void changeFilterFiles(FiltersState& filters, const OtherFile& other) {
    const AnyVector names = filters.names();
    for (int i = 0; i < filters.count(); ++i) {
        const std::unique_ptr<QvCodec> filter(qv_registry()->newCodec(names.at(i).asString("")));
        if (!filter) continue;
        AnyDict dict = filters.filterAt(i);
        filter->restore(dict);
        if (!changeFiles(*filter, other)) continue;
        filter->store(dict);
        filters.setFilterAt(i, dict);
    }
}

void visitFilterFiles(const FiltersState& filters, const FilterFileVisit& visit) {
    const AnyVector names = filters.names();
    for (int i = 0; i < filters.count(); ++i) {
        const std::unique_ptr<QvCodec> filter(qv_registry()->newCodec(names.at(i).asString("")));
        if (!filter || !filters.filterAt(i).get("_on").isTrue()) continue;
        filter->restore(filters.filterAt(i));
        changeFiles(*filter, [&](const std::string& file, const char*, bool writes) {
            visit(*filter, file, writes);
            return file;
        });
    }
}

FilterFiles filterFiles(const QvVProcessPipe& pipe) {
    FilterFiles files;
    for (int i = 0; i < pipe.nrFilters(); ++i) {
        const QvCodec& filter = *pipe.filter(i);
        for (const auto& param : filesRead(filter))
            if (const Any value = filter.getParam(param.c_str()); value.isText())
                files.read.emplace_back(value.toString().asString(""));
        if (const auto name = filterFile(filter, QV_GUI_FILESELECT_SAVE); !name.empty())
            files.written.push_back({name, filter.name()});
    }
    return files;
}

std::unique_ptr<QvVProcessPipe> tryPipe(const VideoJobDescription& job) {
    std::unique_ptr<QvVProcessPipe> pipe;
    try {
        pipe.reset(QvProcessUtil::createVideoPipeAux(job, nullptr, true));
    } catch (const QvAssertFailure& failure) {
        throw ::failure(Msg::chainRefused, {failure.what()});
    }
    for (int i = 0; pipe && i < pipe->nrFilters(); ++i) tryFilter(*pipe->filter(i));
    return pipe;
}

namespace {

std::string described(const std::string& name, const AnyDict& state) {
    std::string line = name;
    const std::unique_ptr<QvCodec> fresh(qv_registry()->newCodec(name.c_str()));
    AnyDict initial;
    if (fresh) fresh->store(initial);
    addSettings(state, initial, line);
    return line;
}

}  // namespace

std::vector<std::string> describe(const QvVProcessPipe* pipe) {
    std::vector<std::string> lines;
    for (int i = 0; pipe && i < pipe->nrFilters(); ++i) {
        AnyDict state;
        pipe->filter(i)->store(state);
        lines.push_back(described(pipe->filter(i)->name(), state));
    }
    return lines;
}

std::vector<std::string> describe(const FiltersState& filters) {
    std::vector<std::string> lines;
    const AnyVector names = filters.names();
    for (int i = 0; i < filters.count(); ++i)
        if (const AnyDict& state = filters.filterAt(i); state.get("_on").isTrue())
            lines.push_back(described(names.at(i).asString(""), state));
    return lines;
}

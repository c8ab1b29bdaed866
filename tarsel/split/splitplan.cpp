#include "tarsel/split/splitplan.h"

#include <algorithm>
#include <numeric>
#include <string_view>

#include "tarsel/job/task/divide.h"
#include "tarsel/words/messages.h"

namespace {

constexpr long long kMostUnit = 1'000'000'000;  // frames; no job is as long

// The smallest n for which n * num / den is a whole number.
long long wholeAt(long long num, long long den) { return den / std::gcd(num, den); }

// Limited to kMostUnit.
long long leastCommonMultiple(long long a, long long b) {
    const long long factor = b / std::gcd(a, b);
    return a > kMostUnit / factor ? kMostUnit : a * factor;
}

// Filters that can start in the middle: parttask.cpp moves what they count from the start.
bool isMovable(std::string_view filter) {
    return filter == "subtitle" || filter == "timecode" || filter == "videofade";
}

void requireDivisibleFilters(const JobPlan& plan, const PlannedStream& picture) {
    if (!plan.filterFiles.written.empty())
        throw failure(Msg::splitFilter, {plan.filterFiles.written.front().filter});
    for (const Any& name : picture.filters.names(true))
        if (const std::string filter = name.asString(""); !isMovable(filter) && !isDivisible(filter))
            throw failure(Msg::splitFilter, {filter});
}

void requireDivisibleOutput(const JobPlan& plan) {
    const OutputForm& output = plan.output;
    const bool kind = output.kind == OutputKind::raw || output.kind == OutputKind::pictures ||
                      output.kind == OutputKind::avi || isFilm(plan);
    // Sound without an encoder exists only in what its multiplexer writes, so it can't be made as a part.
    const auto isBare = [](const PlannedStream& stream) {
        return stream.encoder() == std::string_view("dummyaenc");
    };
    if (!output.isFiles() || !kind || std::ranges::any_of(plan.streams, isBare))
        throw failure(Msg::splitOutput, {output.name});
    if (plan.count(qvVideoStream) != 1) throw failure(Msg::splitPictures, {output.name});
}

// Frames of the output up to the end of the input. After that its last frame may be repeated, by the last
// part.
long long framesOfInput(const JobPlan& plan, const PlannedStream& picture) {
    const QvFramerate& rate = plan.source(picture).picture.rate;
    QvFrameRange range(picture.part.in, std::min(picture.part.out, plan.source(picture).end()), rate);
    if (!range.empty()) range.convert(rate, picture.picture.rate);
    return std::min<long long>(range.out, picture.expected);
}

// Frames of the input that the filter needs before the first one that is used.
long long prerollOf(const std::string& filter) {
    const QvModule* const module = qv_registry()->module(filter.c_str());
    return module ? std::max(module->getAttr("preroll").asInt32(0), 0) : 0;
}

long long prerollOf(const PlannedStream& picture) {
    long long frames = 0;
    for (const Any& name : picture.filters.names(true)) frames += prerollOf(name.asString(""));
    return frames;
}

// A filter that needs a lead-in; "": none.
std::string filterWithPreroll(const PlannedStream& picture) {
    for (const Any& name : picture.filters.names(true))
        if (prerollOf(name.asString("")) > 0) return name.asString("");
    return "";
}

// The preroll of all filters in frames of the output, rounded up to the unit.
long long leadOf(const JobPlan& plan, const PlannedStream& picture, long long unit) {
    const QvRatio out = picture.picture.rate.rate(), in = plan.source(picture).picture.rate.rate();
    const long long inUnit =
        unit * in.num * out.den / (static_cast<long long>(in.den) * out.num);  // frames of the input, whole
    const long long preroll = prerollOf(picture);
    return (preroll + inUnit - 1) / inUnit * unit;
}

}  // namespace

std::string recorderOf(const JobPlan& plan) {
    const QvModule* const muxer =
        plan.output.kind == OutputKind::module ? qv_registry()->module(plan.output.muxer()) : nullptr;
    return muxer ? muxer->getAttr("recorder").asString("") : "";
}

bool isCodedAlone(const PlannedStream& picture) {
    const QvModule* const module = qv_registry()->module(picture.encoder().c_str());
    const auto is = [module](const char* trait) { return module && module->getAttr(trait).isTrue(); };
    return picture.encoder() == std::string_view("rawvenc") || is("onlyKeys") || is("uncompressed");
}

const PlannedStream& pictureOf(const JobPlan& plan) { return *plan.firstVideo(); }

long long splitUnit(const JobPlan& plan) {
    const PlannedStream& picture = pictureOf(plan);
    const QvRatio out = picture.picture.rate.rate(), in = plan.source(picture).picture.rate.rate();
    long long unit =
        wholeAt(static_cast<long long>(in.num) * out.den, static_cast<long long>(in.den) * out.num);
    for (const PlannedStream& stream : plan.streams)
        if (!stream.isVideo())
            unit = leastCommonMultiple(
                unit, wholeAt(static_cast<long long>(stream.sound.samplerate) * out.den, out.num));
    return unit;
}

PartShare shareOf(size_t parts, int cores, int threads, int processors) {
    const int most = processors > 0 ? processors : std::max(cores, 1);
    const int atOnce = static_cast<int>(std::min<size_t>(parts, static_cast<size_t>(most)));
    return {atOnce, threads > 0 && processors == 0 ? threads : std::max(most / atOnce, 1)};
}

SplitPlan planSplit(const JobPlan& plan, int parts) {
    requireDivisibleOutput(plan);
    const PlannedStream& picture = pictureOf(plan);
    requireDivisibleFilters(plan, picture);
    // Coded pictures of the lead-in can't be dropped if later ones depend on them.
    if (const std::string filter = isFilm(plan) && !isCodedAlone(picture) ? filterWithPreroll(picture) : "";
        !filter.empty())
        throw failure(Msg::splitFilter, {filter});
    const long long unit = splitUnit(plan), available = framesOfInput(plan, picture);
    SplitPlan split;
    split.points = {0};
    for (int part = 1; part < parts; ++part) {
        const long long wanted = (available * part / parts + unit / 2) / unit * unit;
        if (wanted > split.points.back() && wanted < available) split.points.push_back(wanted);
    }
    split.points.push_back(picture.expected);
    split.leadIn = leadOf(plan, picture, unit);
    return split;
}

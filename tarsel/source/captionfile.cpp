#include "tarsel/source/captionfile.h"

#include <string_view>
#include <utility>

#include "tarsel/host/events.h"
#include "tarsel/host/files.h"
#include "tarsel/source/source.h"
#include "tarsel/words/messages.h"
#include "tarsel/words/timespec.h"

bool isSubtitleFile(const std::string& name) {
    const Any extension = QvFile::getExt(Any(name.c_str()), true);
    return extension == "srt" || extension == "sub";
}

bool isFilm(const std::string& name) {
    const AnyVector readers = qv_registry()->decoders(QvFile::getExt(Any(name.c_str()), true).asString());
    return !readers.empty() && readers.at(0) == "avdec";
}

namespace {

// Some languages have two codes in ISO 639-2, and containers differ in which they use.
constexpr std::pair<std::string_view, std::string_view> kTwins[] = {
    {"deu", "ger"}, {"nld", "dut"}, {"ces", "cze"}, {"zho", "chi"}, {"ell", "gre"},
    {"fas", "per"}, {"fra", "fre"}, {"ron", "rum"}, {"slk", "slo"}, {"sqi", "alb"},
    {"hye", "arm"}, {"eus", "baq"}, {"mya", "bur"}, {"kat", "geo"}, {"isl", "ice"},
    {"mkd", "mac"}, {"msa", "may"}, {"bod", "tib"}, {"cym", "wel"}, {"mri", "mao"},
};

std::string_view languageCode(std::string_view language) {
    for (const auto& [code, twin] : kTwins)
        if (language == twin) return code;
    return language;
}

}  // namespace

int subtitleStream(const std::string& name, const std::string& choice) {
    const bool isNumber = !choice.empty() && choice.find_first_not_of("0123456789") == std::string::npos;
    std::string there;
    if (isSubtitleFile(name)) {
        if (choice.empty() || choice == "0") return 0;
        there = "0";
    } else {
        const Source source(name, "");
        const QvDecodePipe& film = source.decoder();
        for (int i = 0; i < film.nrStreams(qvSubpicStream); ++i) {
            const Any tag = film.getSubpicParam(i, "language");
            const std::string language = tag.isText() ? tag.toString().asString("") : "";
            if (choice.empty() || (isNumber && choice == std::to_string(i)) ||
                (!isNumber && languageCode(choice) == languageCode(language)))
                return i;
            there +=
                (there.empty() ? "" : ", ") + std::to_string(i) + (language.empty() ? "" : " " + language);
        }
    }
    throw failure(Msg::subtitlesNoStream, {name, choice, there.empty() ? "none of text" : there});
}

QvFramerate readScc(const std::string& name, int field, const std::optional<QvFramerate>& asked,
                    QvCcData& data) {
    const Any file(name.c_str());
    QvFramerate rate;
    if (data.readScc(file, field, true, rate, nullptr, true) != QvStatus::ok || data.count() == 0)
        refuseScc(name);
    printWarnings();
    if (!asked) return rate;
    const bool same = asked->rate() == rate.rate();
    if (!same)
        tell(Level::warning, lineOf(Msg::captionsRateUnlikely, {name, formatRate(rate), formatRate(*asked)}));
    QvFramerate counting = *asked;
    counting.setDf(asked->df() || (same && rate.df()));
    if (data.readScc(file, field, false, counting, nullptr, true) != QvStatus::ok)
        throw failure(Msg::readFailed, {name});
    qv_log()->clear();  // the same warnings
    return counting;
}

void refuseScc(const std::string& name) { refuseScc(name, firstBytes(name, kSccHead)); }

void refuseScc(const std::string& name, const std::string& head) {
    constexpr std::string_view kTitle = "Scenarist_SCC V1.0";
    constexpr std::string_view kMark = "\xEF\xBB\xBF";  // of UTF-8
    static_assert(kSccHead == kTitle.size() + kMark.size());
    std::string_view text = head;
    if (text.substr(0, kMark.size()) == kMark) text.remove_prefix(kMark.size());
    throw failure(text.substr(0, kTitle.size()) == kTitle ? Msg::inputNoCaptions : Msg::inputNoScc, {name});
}

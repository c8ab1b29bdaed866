#include "tarsel/source/captionfile.h"

#include <string_view>

#include "tarsel/host/events.h"
#include "tarsel/host/files.h"
#include "tarsel/source/source.h"
#include "tarsel/words/messages.h"
#include "tarsel/words/timespec.h"

bool isSubtitleFile(const std::string& name) {
    const Any extension = QvFile::getExt(Any(name.c_str()), true);
    return extension == "srt" || extension == "sub";
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

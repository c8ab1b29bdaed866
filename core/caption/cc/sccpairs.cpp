#include "core/caption/cc/sccpairs_p.h"

#include <algorithm>
#include <cstdio>
#include <string>

#include "core/arch/qvassert.h"
#include "core/caption/cc/sccfile_p.h"
#include "core/engine/files/qvfileutil.h"
#include "core/engine/log/qvlog.h"
#include "core/engine/status.h"
#include "core/measure/qvnum.h"
#include "core/value/any.h"

namespace {

constexpr std::ptrdiff_t longestWrittenLine = 1000;  // pairs

std::string timecodeText(const MediaTime& time, const QvFramerate& rate, bool semicolon) {
    char text[QvTimecode::textSize];
    time.timecode(rate).pprint(text, false);
    std::string written = text;
    if (semicolon) written[written.rfind(':')] = ';';
    return written;
}

std::string wordText(const QvCcBytePair& pair, bool fourDigits) {
    char text[8];
    std::snprintf(text, sizeof text, fourDigits ? "%02x%02x" : "%2x%2x", pair.byte1, pair.byte2);
    return text;
}

void reportDamage(const SccFile& scc, const char* name) {
    for (const auto& [line, what] : scc.damage)
        qv_log()->warning("%s, line %d: %s", name, line, what.c_str());
    if (const int more = scc.damaged - static_cast<int>(scc.damage.size()); more > 0)
        qv_log()->warning("%s has %d more such places", name, more);
}

}  // namespace

int qvReadScc(QvByteSource* source, const Any& filename, int type, bool detect, QvFramerate& rate,
              const bool* dropFrame, bool dropFrameLines, std::vector<QvCcBytePair>& pairs) {
    QV_ASSERT(type == QvCcBytePair::field1 || type == QvCcBytePair::field2);
    SccFile scc;
    const int result =
        source ? scc.read(*source, filename, dropFrameLines) : scc.read(filename, dropFrameLines);
    if (result != QvStatus::ok) return QvStatus::noSegment;
    if (dropFrameLines) reportDamage(scc, filename.toString().asString(""));
    const QvFramerate likely = scc.likelyRate(detect);
    if (detect)
        rate = likely;
    else if (!QvNum::equ(rate.rate().ratio(), likely.rate().ratio(), QvRatio::tolerance))
        qv_log()->warning("framerate for %s set to %f, but it could be %f.", filename.toString().asString(""),
                          rate.rate().ratio(), likely.rate().ratio());
    if (dropFrame) rate.setDf(*dropFrame);

    pairs.clear();
    pairs.reserve(scc.words.size());
    auto word = scc.words.begin();
    for (const SccLine& line : scc.lines) {
        const MediaTime time(line.timecode.frameNr(rate, false), rate, MediaTime::defaultTimescale);
        QvCcBytePair pair(time, type, 0, 0, true);
        for (std::size_t i = 0; i < line.words; ++i, ++word) {
            pair.byte1 = static_cast<unsigned char>(*word >> 8);
            pair.byte2 = static_cast<unsigned char>(*word);
            pairs.push_back(pair);
        }
    }
    return QvStatus::ok;
}

std::string qvSccText(std::span<const QvCcBytePair> pairs, const QvFramerate& rate,
                      const QvSccWriting& options) {
    std::string text = "Scenarist_SCC V1.0\n\n";
    for (auto pair = pairs.begin(); pair != pairs.end();) {
        auto end = std::find_if(pair, pairs.end(), [&](const auto& p) { return !(p.time == pair->time); });
        if (options.complete)
            end = std::min(end, pair + std::min(end - pair, longestWrittenLine));
        else
            QV_ASSERT_MSG(end - pair <= longestWrittenLine, "writeScc: too many byte pairs in a line");
        text += timecodeText(pair->time, rate, options.dropFrameLines && rate.df());
        for (char separator = '\t'; pair != end; ++pair, separator = ' ')
            text += separator + wordText(*pair, options.complete);
        text += "\n\n";
    }
    return text += "\n";
}

int qvSaveScc(const Any& filename, const std::string& text) {
    const Any name = filename.toString();
    auto* file = static_cast<std::FILE*>(QvFile::fopen(filename, "wb"));
    if (!file) {
        qv_dbg()->error("Can not open %s for writing.", name.asString(""));
        return QvStatus::failed;
    }
    const bool written = std::fwrite(text.data(), 1, text.size(), file) == text.size();
    if (std::fclose(file) == 0 && written) return QvStatus::ok;
    qv_dbg()->error("Can not write %s.", name.asString(""));
    return QvStatus::failed;
}

#include "tarsel/job/plan/timecodes.h"

#include <algorithm>

namespace {

QvFramerate counted(const QvFramerate& rate, bool drops) {
    const QvRatio r = rate.rate();
    const bool ntsc = r.den == 1001 && (r.num == 30000 || r.num == 60000);
    return QvFramerate(r, 0, drops && ntsc);
}

std::string formatted(long long frame, const QvFramerate& from, const QvFramerate& to) {
    constexpr long long day = 24 * 3600;
    const auto nominal = [](const QvFramerate& rate) {
        return std::max<long long>(1, static_cast<long long>(rate.rate().ratio() + 0.999));
    };
    frame %= day * nominal(from);
    QvTimecode code(static_cast<int>(frame), from, false);
    if (nominal(from) != nominal(to) || from.df() != to.df()) {
        const long long count = code.frames() * nominal(to) / nominal(from);
        code = QvTimecode(code.hours(), code.minutes(), code.seconds(), static_cast<int>(count));
        // A number that drop-frame leaves out becomes that of the next frame.
        code = QvTimecode(code.frameNr(to, false), to, false);
    }
    char text[QvTimecode::textSize];
    code.pprint(text, false);
    std::string written = text;
    if (to.df()) written[8] = ';';
    return written;
}

}  // namespace

std::string movedTimecode(const std::string& text, const QvFramerate& from, const QvFramerate& to,
                          const std::function<long long(const QvFramerate& from)>& frames) {
    const bool drops = text.find(';') != std::string::npos;
    const QvFramerate in = counted(from, drops), out = counted(to, drops);
    return formatted(QvTimecode(text.c_str()).frameNr(in, false) + frames(in), in, out);
}

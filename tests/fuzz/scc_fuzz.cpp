// Any file opens or is refused with a status; every pair of what opened comes out of some frame, and a list
// that is written whole reads back whole.
#include <algorithm>

#include "builtin/decoders/sccdec.h"
#include "core/caption/cc/cctext.h"
#include "tests/fuzz/fuzz.h"

namespace {

// Only frames near a pair: a file may leave hours between two.
void checkReading(SccDec& decoder, const QvCcData& data, const QvFramerate& rate) {
    std::size_t found = 0;
    for (auto pair = data.pairs().begin(); pair != data.pairs().end();) {
        require(decoder.seekToFrame(pair->time.position(rate), 0) == 0 && decoder.readFrame(0) == 0);
        AnyDict dict;
        QvCcData frame;
        require(decoder.readMeta(0, 0, dict) == 0 && frame.restore(dict) == 0);
        found += frame.pairs().size();
        qvCcText(frame.pairs(), 0);
        frame.dbgDump(&rate);
        const MediaTime last = frame.maxTime();
        pair = std::find_if(pair, data.pairs().end(), [&](const auto& p) { return p.time > last; });
    }
    require(found == data.pairs().size());
}

void checkWriting(const QvCcData& data, const QvFramerate& rate) {
    const MemoryFile file;
    require(data.writeScc(Any(file.name()), rate, {.complete = true}) == 0);
    QvCcData back;
    QvFramerate given = rate;
    const bool df = rate.df();
    require(back.readScc(Any(file.name()), 0, false, given, &df) == 0 && back.count() == data.count());
    for (int i = 0; i < back.count(); ++i)
        require(back.at(i).byte1 == data.at(i).byte1 && back.at(i).byte2 == data.at(i).byte2);
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* bytes, std::size_t size) {
    const MemoryFile file(bytes, size);
    for (const bool dropFrameLines : {false, true}) {
        SccDec decoder;
        decoder.init();
        decoder.setParam("dropFrameLines", dropFrameLines ? 1 : 0);
        decoder.setParam("filenameField1", file.name());
        QvCcData data;
        QvFramerate rate;
        const int status = data.readScc(Any(file.name()), 0, true, rate, nullptr, dropFrameLines);
        require(status == 0 || status == -15);
        require(decoder.open() == (data.count() > 0 ? 0 : -9));
        if (data.count() == 0) continue;
        data.sort();
        checkReading(decoder, data, rate);
        if (dropFrameLines) checkWriting(data, rate);
    }
    return 0;
}

#include "plugins/av/mux/multiplexer.h"

#include <gmock/gmock.h>

#include <algorithm>

#include "core/encode/qvsink.h"
#include "core/measure/qvgeometry.h"
#include "tests/plugins/av/films.h"
#include "tests/plugins/av/mux/unitsender.h"
#include "tests/support/engine.h"

namespace {

using testing::HasSubstr;

class Multiplexers : public Films {
  protected:
    // Sends a film's units into a new file. "" or the text of the failure.
    std::string mux(const std::string& module, UnitSender& from, const std::string& file,
                    const AnyDict& params = AnyDict(), bool abort = false) {
        const std::unique_ptr<QvCodec> made(av::newMultiplexer(module.c_str()));
        auto& muxer = static_cast<QvMuxer&>(*made);
        const std::unique_ptr<QvCodec> codec(qv_registry()->newCodec("filesink"));
        auto& sink = static_cast<QvSink&>(*codec);
        muxer.init();
        sink.setParam("filename", Any(file.c_str()));
        muxer.setParam("filename", Any(file.c_str()));
        muxer.setParamDict(params);
        from.addTo(muxer);
        muxer.attachOutStream(sink.stream());
        std::string problem;
        if (sink.open() != 0) return sink.errorDesc();
        if (muxer.open() != 0) {
            problem = muxer.errorDesc();
        } else {
            const bool sent = from.sendHeads() && from.sendUnits();
            if (!abort && muxer.close() != 0) problem = muxer.errorDesc();
            EXPECT_EQ(sent, problem.empty()) << problem;
            if (abort) muxer.abort();
        }
        from.detach();
        if (abort || !problem.empty())
            sink.abort();
        else if (sink.close() != 0)
            problem = sink.errorDesc();
        muxer.detachOutStream();
        return problem;
    }
    // Hashes of the decoded pictures or samples, one a line, and the times of the pictures in frames.
    std::string decoded(const std::string& film, const char* kind) const {
        const Outcome read = ffmpeg({"-i", film, "-map", std::string("0:") + kind, "-fps_mode", "passthrough", "-f",
                                     *kind == 'v' ? "framehash" : "hash", "-"});
        EXPECT_EQ(read.status, 0) << film << read.err;
        return read.out;
    }
    static std::vector<std::int64_t> times(const UnitSender& film, std::size_t stream) {
        std::vector<std::int64_t> all;
        for (const auto& unit : film.units)
            if (unit.stream == stream) all.push_back(unit.pts);
        return all;
    }

    EngineScope engine_;
};

TEST_F(Multiplexers, probe) {
    const std::string source = folder.file("source.mp4");
    ASSERT_EQ(ffmpeg({"-f", "lavfi", "-i", kMoving, "-f", "lavfi", "-i", "sine=frequency=440:duration=2", "-c:v",
                      "libx264", "-bf", "2", "-c:a", "aac", source})
                  .status,
              0);
    UnitSender film(source);
    for (const char* const name : {"mp4mux:out.mp4", "movmux:out.mov", "mkvmux:out.mkv", "mptsmux:out.ts"}) {
        const std::string all = name, module = all.substr(0, all.find(':')), file = folder.file(all.substr(all.find(':') + 1));
        EXPECT_EQ(mux(module, film, file, AnyDict("_totalFrames", 50)), "") << name;
        const Outcome shown = runProgram({"/usr/bin/env", "ffprobe", "-v", "error", "-show_entries",
             "stream=codec_name,codec_tag_string,start_time,duration,nb_frames,avg_frame_rate,initial_padding:format=start_time,duration", "-of", "compact", file});
        std::puts(shown.out.c_str());
        std::puts(shown.err.c_str());
    }
}

}  // namespace

#include "plugins/av/index/packetindex.h"

#include <algorithm>
#include <vector>

#include "core/value/any.h"
#include "plugins/av/source/avheaders.h"
#include "plugins/av/source/mediainput.h"
#include "tests/plugins/av/films.h"
#include "tests/plugins/av/watchedsource.h"
#include "tests/support/engine.h"

namespace {

class IndexOfFilms : public Films {
  protected:
    using From = av::PacketIndex::From;

    // The packets of all streams as numbers, and the damage. Which ones are keys is the table's word, or that
    // of the packets' own bytes: both do to start at.
    std::string build(WatchedSource& source, const std::string& name, From from) {
        const av::MediaBytes bytes(source, Any(name.c_str()));
        std::string reason;
        const auto input = av::MediaInput::open(bytes, "", reason);
        if (!input) return reason;
        source.taken = 0;
        const auto index = av::PacketIndex::build(*input, reason, from);
        if (!index) return reason;
        std::string text = index->damage();
        for (unsigned i = 0; i < input->context().nb_streams; ++i)
            for (const av::IndexedPacket& p : index->packets(static_cast<int>(i)))
                for (const long long number :
                     {static_cast<long long>(p.pts), static_cast<long long>(p.dts),
                      static_cast<long long>(p.position), static_cast<long long>(p.duration),
                      static_cast<long long>(p.flags & ~1u), static_cast<long long>(p.skipAtStart),
                      static_cast<long long>(p.skipAtEnd), static_cast<long long>(p.bytes),
                      static_cast<long long>(p.samples)})
                    text += std::to_string(number) + ' ';
        return text;
    }

    // What a survey is for: the times of each stream's pictures in their order, and how many samples it has.
    // The times as they come are added to `order`.
    std::string counts(const std::string& film, const std::string& name, From from,
                       std::vector<std::int64_t>& order) {
        WatchedSource source(film);
        const av::MediaBytes bytes(source, Any(name.c_str()));
        std::string reason, text;
        const auto input = av::MediaInput::open(bytes, "", reason);
        const auto index = input ? av::PacketIndex::build(*input, reason, from) : nullptr;
        if (!index) return reason;
        for (unsigned i = 0; i < input->context().nb_streams; ++i) {
            std::vector<std::int64_t> times;
            std::uint64_t samples = 0, skipped = 0;
            for (const av::IndexedPacket& p : index->packets(static_cast<int>(i))) {
                if (p.flags & AV_PKT_FLAG_DISCARD) continue;
                times.push_back(p.pts);
                samples += p.samples;
                skipped += p.skipAtStart + p.skipAtEnd;
            }
            order.insert(order.end(), times.begin(), times.end());
            std::sort(times.begin(), times.end());
            for (const std::int64_t time : times) text += std::to_string(time) + ' ';
            text += std::to_string(samples) + ' ' + std::to_string(skipped) + '\n';
        }
        return text;
    }

    EngineScope engine_;
};

TEST_F(IndexOfFilms, tablesGiveWhatAPassGivesWithoutTheBytes) {
    const std::string source = "testsrc2=size=320x240:rate=25:duration=8[out0];sine=duration=8[out1]";
    std::string captions = "Scenarist_SCC V1.0\n\n";
    for (int second = 0; second < 8; ++second)
        captions += "00:00:0" + std::to_string(second) + ":10\t9420 9470 c8e5 ecec ef80 942c 942f\n\n";
    folder.write("captions.scc", captions);
    const struct {
        const char* name;
        Words options;
        bool table, moved = false;  // pictures that are decoded in another order, with times of a survey
    } cases[] = {
        {"b.mp4", {"-c:v", "mpeg4", "-b:v", "4M", "-bf", "2", "-c:a", "aac"}, true, true},
        {"cut.mp4", {"-ss", "0.3", "-c:v", "mpeg4", "-bf", "2", "-c:a", "aac"}, true, true},
        {"steps.mp4",
         {"-vf", "select=not(eq(mod(n\\,7)\\,3))", "-fps_mode", "vfr", "-c:v", "mpeg4", "-bf", "2", "-c:a",
          "aac"},
         true},
        {"fast.mp4", {"-c:v", "mpeg4", "-b:v", "4M", "-c:a", "aac", "-movflags", "+faststart"}, true},
        {"pcm.mov", {"-c:v", "mjpeg", "-q:v", "3", "-c:a", "pcm_s16le", "-timecode", "01:00:00:00"}, true},
        {"mp3.mov", {"-c:v", "mpeg4", "-c:a", "mp3"}, false},
        // A track of captions, whose packets the library takes apart.
        {"captions.mov",
         {"-i", folder.file("captions.scc"), "-map", "0:v", "-map", "1", "-c:v", "mpeg4", "-b:v", "4M",
          "-c:s", "copy"},
         false},
        {"parts.mp4", {"-c:v", "mpeg4", "-c:a", "aac", "-movflags", "+frag_keyframe+empty_moov"}, false},
        {"both.mp4", {"-c:v", "mpeg4", "-c:a", "aac", "-movflags", "+frag_keyframe"}, false},
        {"film.mkv", {"-c:v", "mpeg4", "-c:a", "aac"}, false},
    };
    for (const auto& c : cases) {
        SCOPED_TRACE(c.name);
        const std::string bytes = TempFolder::read(film(c.name, c.options, source));
        for (const std::size_t length : {bytes.size(), bytes.size() * 7 / 10}) {
            WatchedSource film(bytes.substr(0, length));
            const std::string pass = build(film, c.name, From::packets);
            EXPECT_EQ(build(film, c.name, From::table), pass);
            std::vector<std::int64_t> read, listed;
            EXPECT_EQ(counts(bytes.substr(0, length), c.name, From::survey, listed),
                      counts(bytes.substr(0, length), c.name, From::packets, read));
            EXPECT_EQ(c.moved && length == bytes.size(), read != listed) << "times are those of the table";
            if (c.table && pass.size() > 1000) {
                EXPECT_LT(film.taken, length / 4);
            }
        }
    }
}

}  // namespace

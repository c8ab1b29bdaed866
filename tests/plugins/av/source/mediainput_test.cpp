#include "plugins/av/source/mediainput.h"

#include <utility>

#include "plugins/av/index/packetindex.h"
#include "plugins/av/source/avheaders.h"
#include "tests/plugins/av/films.h"
#include "tests/plugins/av/watchedsource.h"
#include "tests/support/engine.h"

namespace {

using av::MediaInput;

class MediaInputOfFilms : public Films {
  protected:
    EngineScope engine_;
};

TEST_F(MediaInputOfFilms, readersOfOneSourceDoNotDisturbEachOther) {
    WatchedSource source(TempFolder::read(film("film.mkv", {"-c:v", "mpeg4", "-g", "5"})));
    const av::MediaBytes bytes(source, Any("film.mkv"));
    std::string reason;
    const auto first = MediaInput::open(bytes, "", reason), second = MediaInput::open(bytes, "", reason);
    ASSERT_TRUE(first && second) << reason;
    const av::PacketPtr a(av_packet_alloc()), b(av_packet_alloc());
    for (int i = 0; i < 50; ++i) {
        ASSERT_EQ(first->read(*a), MediaInput::Read::packet);
        ASSERT_EQ(second->read(*b), MediaInput::Read::packet);
        EXPECT_EQ(a->pts, b->pts);
        EXPECT_EQ(a->size, b->size);
        av_packet_unref(a.get());
        av_packet_unref(b.get());
    }
    EXPECT_EQ(first->read(*a), MediaInput::Read::end);
    source.fails = true;
    ASSERT_TRUE(!second->rewind() || second->read(*b) == MediaInput::Read::failed);
    EXPECT_NE(second->failure().find("cable"), std::string::npos) << second->failure();
}

TEST_F(MediaInputOfFilms, aSeekFindsEveryPacketOfTheIndex) {
    const Words mpeg = {"-c:v", "mpeg2video", "-g", "12", "-bf", "2"};
    const std::pair<const char*, Words> films[] = {
        {"film.mp4", mpeg},
        {"film.ts", mpeg},
        {"film.mkv", mpeg},
        {"film.avi", mpeg},
        {"film.mpg", mpeg},
        {"film.m2v", mpeg},
        {"keyless.mkv", {"-c:v", "vc2", "-pix_fmt", "yuv420p"}},  // no block is marked as key
    };
    for (const auto& [name, options] : films) {
        SCOPED_TRACE(name);
        const av::MediaBytes bytes{Any(film(name, options).c_str())};
        std::string reason;
        const auto input = MediaInput::open(bytes, "", reason);
        ASSERT_TRUE(input) << reason;
        const auto index = av::PacketIndex::build(*input, reason);
        ASSERT_TRUE(index) << reason;
        ASSERT_EQ(index->packets(0).size(), 50u);
        const av::PacketPtr packet(av_packet_alloc());
        for (const std::size_t wanted : {49u, 0u, 31u, 24u, 7u}) {
            ASSERT_TRUE(input->seekTo(0, index->keyOf(0, wanted), wanted)) << wanted << input->failure();
            // As many follow as in the index: it is this one.
            std::size_t follow = 0;
            while (input->read(*packet) == MediaInput::Read::packet) {
                ++follow;
                av_packet_unref(packet.get());
            }
            EXPECT_EQ(follow, 50 - wanted);
        }
    }
}

}  // namespace

#include "builtin/pipes/output/memberaddress.h"

#include "tests/builtin/pipes/output/output_parts.h"

namespace {

using Address = OutputParts;

TEST_F(Address, FindsTheMemberOfAName) {
    auto& video = append<FakeVideoEncoder>(qvVideoStream, {});
    auto& audio = append<FakeAudioEncoder>(qvAudioStream, {});
    end_.put(std::make_unique<FakeMuxer>("rawmux"));
    struct Case {
        const char* name;
        const QvCodec* member;
        const char* rest;  // null: none
    };
    const Case cases[] = {
        {"muxer/a", end_.muxer(), "a"}, {"muxer/", end_.muxer(), ""},    {"muxer/a/b", end_.muxer(), "a/b"},
        {"sink/a", nullptr, "a"},       {"video0", &video, nullptr},     {"video0/", &video, ""},
        {"video0/w", &video, "w"},      {"video0000/w", &video, "w"},    {"audio0/video0", &audio, "video0"},
        {"audio1/w", nullptr, "w"},     {"audio9999", nullptr, nullptr},
    };
    for (const auto& [name, member, rest] : cases) {
        const auto address = MemberAddress::parse(name);
        ASSERT_TRUE(address) << name;
        EXPECT_EQ(address->find(streams_, end_), member) << name;
        EXPECT_EQ(std::string(address->rest ? address->rest : "-"), rest ? rest : "-") << name;
    }
    for (const char* other : {"", "/", "muxer", "sink", "video", "video/", "video/w", "videoX/w", "video-1/w",
                              "video00000/w", "video 1/w", "Video0/w", "muxers/a", "subpic0/w", "vide0/w"})
        EXPECT_FALSE(MemberAddress::parse(other)) << other;
}

}  // namespace

#include "builtin/pipes/output/members/streamrequest.h"

#include "builtin/pipes/output/members/activepreset.h"
#include "tests/support/checks.h"

namespace {

TEST(StreamRequest, ReadsEachFormOfTheArgument) {
    const AnyDict settings("name", "enc", "x", 1), lang("lang", 2);
    struct Case {
        Any argument;
        const char* codec;
        AnyDict settings;
        std::optional<AnyDict> params;
    };
    const Case cases[] = {
        {Any(), "", {}, {}},
        {7, "", {}, {}},
        {"", "", {}, {}},
        {"enc", "enc", {}, {}},
        {wide("enc"), "enc", {}, {}},
        {AnyDict(), "", {}, {}},
        {AnyDict("codec", "enc"), "enc", {}, {}},
        {AnyDict("codec", settings), "enc", settings, {}},
        {AnyDict("stream", AnyDict()), "", {}, AnyDict()},
        {AnyDict("codec", "enc", "stream", lang), "enc", {}, lang},
    };
    for (const auto& [argument, codec, wanted, params] : cases) {
        const auto request = StreamRequest::read(argument);
        EXPECT_EQ(request.codec, codec);
        EXPECT_EQ(request.settings, wanted);
        EXPECT_EQ(request.params, params);
        EXPECT_EQ(StreamRequest::readParams(argument).params, params);
    }
    for (const auto& wrong : {std::pair(AnyDict("codex", "enc"), "unrecognized parameters supplied"),
                              {AnyDict("stream", 1), "unrecognized parameters supplied"},
                              {AnyDict("codec", AnyDict("x", 1)), "'codec' dict must contain 'name'"},
                              {AnyDict("codec", AnyDict("name", "")), "'codec' dict must contain 'name'"},
                              {AnyDict("codec", 5), "'codec' parameter has invalid type"},
                              {AnyDict("codec", ""), "'codec' parameter has invalid type"}})
        EXPECT_EQ(failureOf([&] { StreamRequest::read(wrong.first); }),
                  std::string("EncodePipe.addStream: ") + wrong.second);
}

TEST(StreamRequest, DefaultsFillOnlyWhatIsMissing) {
    const StreamDefaults defaults{"other", AnyDict("name", "other"), AnyDict("lang", 1)};
    auto request = StreamRequest::read(AnyDict("codec", "enc", "stream", AnyDict()));
    request.complete(defaults);
    EXPECT_EQ(request.codec, "enc");
    EXPECT_EQ(request.settings, defaults.settings);
    EXPECT_EQ(request.params, defaults.params) << "empty counts as missing";
    request.settings = AnyDict("name", "enc");
    request.params = AnyDict("lang", 9);
    request.complete(defaults);
    EXPECT_EQ(request.settings, AnyDict("name", "enc"));
    EXPECT_EQ(request.params, AnyDict("lang", 9));
}

}  // namespace

#include "core/decode/basedecodepipe.h"

#include "tests/core/decode/fake_decoder.h"
#include "tests/support/checks.h"

namespace {

struct Base : testing::Test {
    Base() {
        decoder.init();
        decoder.open();
    }
    FakeDecoder decoder;
};

// What is refused leaves an error that names the operation.
TEST_F(Base, RefusalsNameTheOperation) {
    EXPECT_EQ(decoder.nrFrames(0), 100);
    const struct {
        std::function<void()> act;
        const char* error;
    } rows[] = {
        {[&] { decoder.select(qvVideoStream, 1); }, "-1 DecodePipe: invalid stream"},
        {[&] { decoder.nrFrames(1); }, "-1 invalid video stream number 1"},
        {[&] { decoder.close(), decoder.nrFrames(0); }, "-18 nrFrames: illegal state"},
    };
    for (const auto& row : rows) {
        SCOPED_TRACE(&row - rows);
        EXPECT_THROW(row.act(), QvAssertFailure);
        EXPECT_EQ(std::to_string(decoder.errorCode()) + " " + decoder.errorDesc(), row.error);
    }
    EXPECT_EQ(decoder.close(), 0);
    EXPECT_EQ(decoder.open(), 0) << "close makes room for the next open";
}

}  // namespace

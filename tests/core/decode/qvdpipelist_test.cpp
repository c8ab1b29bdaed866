#include "core/decode/qvdpipelist.h"

#include "tests/core/decode/fake_decoder.h"
#include "tests/support/checks.h"

namespace {

class Counted : public FakeDecoder {
  public:
    explicit Counted(const char* name) {
        init();
        if (name) setParam("filename", name);
    }
    ~Counted() override { ++gone; }
    int close() override {
        ++closed;
        return FakeDecoder::close();
    }
    static inline int gone = 0, closed = 0;
};

TEST(DPipeList, FindsByNameBehindAnother) {
    Counted a("a"), b("b"), c("a"), foreign("a"), unnamed(nullptr);
    QvDPipeList list;
    for (QvDecodePipe* decoder : {&a, &b, &c}) list.append(decoder);
    EXPECT_EQ(list.findByFilename("a", nullptr), &a);
    EXPECT_EQ(list.findByFilename("a", &a), &c);
    EXPECT_EQ(list.findByFilename("a", &c), nullptr);
    EXPECT_EQ(list.findByFilename("x", nullptr), nullptr);
    EXPECT_THROW(list.findByFilename("a", &foreign), QvAssertFailure);
    list.append(&unnamed);
    EXPECT_THROW(list.findByFilename("x", nullptr), QvAssertFailure);
}

TEST(DPipeList, DeletesEachDecoderOnce) {
    QvDPipeList list;
    QvDecodePipe* const twice = new Counted("a");
    QvDecodePipe* const once = new Counted("b");
    for (QvDecodePipe* decoder : {twice, once, twice}) list.append(decoder);
    Counted::gone = Counted::closed = 0;
    list.deleteAll();
    EXPECT_EQ(Counted::gone, 2);
    EXPECT_EQ(Counted::closed, 2);
    EXPECT_TRUE(list.empty());
}

}  // namespace

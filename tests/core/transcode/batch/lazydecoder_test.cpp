#include <gtest/gtest.h>

#include "core/transcode/batch/lazydecoder_p.h"
#include "tests/support/checks.h"
#include "tests/support/fake_streams.h"

namespace {

// Sources of 100 frames and 1000 samples, counted while they are open.
struct Sources {
    class Counted : public FakeDecoder {
      public:
        explicit Counted(Sources& all) : FakeDecoder(100, QvFramerate::f25p()), all_(all) {
            audio(1000, 48000);
            extra.set("filename", "a.x");
            extra.set("notSeekable", 0);
            all_.most = std::max(all_.most, ++all_.open);
            ++all_.opened;
        }
        ~Counted() override { --all_.open; }
        int setReadUserData(int, int, bool on) override { return reads_ = on, 0; }
        bool readUserData(int, int) const override { return reads_; }

      private:
        bool reads_ = false;
        Sources& all_;
    };

    QvDecodePipe* make() {
        if (gone) return nullptr;
        auto* const made = new Counted(*this);
        made->failAt = failAt;
        return made;
    }
    std::unique_ptr<LazyDecoder> lazy(const std::shared_ptr<OpenDecoders>& others) {
        auto decoder = std::make_unique<LazyDecoder>(others, facts, [this] { return make(); });
        EXPECT_EQ(decoder->open(), 0);
        return decoder;
    }

    int open = 0, opened = 0, most = 0, failAt = -1;
    bool gone = false;
    std::shared_ptr<const SourceFacts> facts = [this] {
        const std::unique_ptr<QvDecodePipe> first(make());
        return std::make_shared<const SourceFacts>(*first);
    }();
};

TEST(LazyDecoder, WhatIsKnownOpensNothing) {
    Sources sources;
    sources.opened = 0;
    const auto lazy = sources.lazy(std::make_shared<OpenDecoders>(4));
    QvDecodePipe& decoder = *lazy;
    AnyDict params, stored;
    decoder.getStreamParams(1, 0, params);
    decoder.store(stored);
    EXPECT_EQ(params.get("width"), 16);
    EXPECT_EQ(stored.get("name"), "unnamed");
    EXPECT_EQ(decoder.nrFrames(0), 100);
    EXPECT_EQ(decoder.nrSamples(0), 1000);
    EXPECT_EQ(decoder.nrStreams(0), 2);
    EXPECT_EQ(decoder.nrStreams(4), 0);
    EXPECT_EQ(decoder.duration(1, 0), MediaTime(4.0));
    EXPECT_EQ(decoder.QvCodec::getParam("filename"), "a.x");
    EXPECT_EQ(decoder.QvCodec::getParam("audio0/samplerate"), 48000);
    EXPECT_EQ(decoder.select(1, 0), 0);
    EXPECT_TRUE(decoder.isSelected(1, 0));
    EXPECT_EQ(decoder.seekToFrame(7, 0), 0);
    EXPECT_EQ(decoder.getFramePtr(0), nullptr);
    EXPECT_EQ(sources.opened, 0);
    // What is not known is asked once for all decoders of the source.
    EXPECT_EQ(decoder.QvCodec::getParam("notSeekable"), 0);
    lazy->rest();
    EXPECT_EQ(sources.lazy(std::make_shared<OpenDecoders>(4))->QvCodec::getParam("notSeekable"), 0);
    EXPECT_EQ(sources.opened, 1);
    EXPECT_EQ(sources.open, 0);
}

TEST(LazyDecoder, ReadsGoOnWhereTheyWereWhenTheSourceWasClosed) {
    Sources sources;
    const auto others = std::make_shared<OpenDecoders>(3);
    std::vector<std::unique_ptr<LazyDecoder>> decoders;
    for (int i = 0; i < 40; ++i) decoders.push_back(sources.lazy(others));
    sources.opened = sources.most = 0;
    for (int i = 0; i < 40; ++i) {
        decoders[static_cast<std::size_t>(i)]->seekToFrame(i, 0);
        decoders[static_cast<std::size_t>(i)]->seekToSample(10 * i, 0);
    }
    EXPECT_EQ(sources.opened, 0);
    for (int round = 0; round < 3; ++round)
        for (int i = 0; i < 40; ++i) {
            LazyDecoder& decoder = *decoders[static_cast<std::size_t>(i)];
            ASSERT_EQ(decoder.readFrame(0), 0);
            ASSERT_EQ(decoder.getFramePtr(0)->frameNr, i + round);
            ASSERT_EQ(decoder.readSamples(5, 0), 5);
            short first = 0;
            std::memcpy(&first, decoder.getAudioPtr(0)->ptr(0), sizeof first);
            ASSERT_EQ(first, 10 * i + 5 * round + 1);
        }
    EXPECT_EQ(sources.most, 3);
    EXPECT_EQ(sources.opened, 120);
    EXPECT_EQ(others->count(), 3);
    decoders.clear();
    EXPECT_EQ(sources.open + others->count(), 0);
}

TEST(LazyDecoder, TheOneThatWasReadLastStaysOpen) {
    Sources sources;
    const auto others = std::make_shared<OpenDecoders>(2);
    const auto a = sources.lazy(others), b = sources.lazy(others), c = sources.lazy(others);
    for (LazyDecoder* decoder : {a.get(), b.get(), a.get(), c.get()}) decoder->readFrame(0);
    EXPECT_TRUE(a->isAwake() && c->isAwake());
    EXPECT_FALSE(b->isAwake());
    EXPECT_EQ(b->readFrame(0), 0);
    EXPECT_EQ(b->getFramePtr(0)->frameNr, 1);
}

// A file that is cut into many segments is opened once.
TEST(LazyDecoder, ASourceThatNobodyReadsGoesToTheNextDecoderOfItsFile) {
    Sources sources, others;
    const auto open = std::make_shared<OpenDecoders>(2);
    const auto first = sources.lazy(open), second = sources.lazy(open), third = sources.lazy(open);
    const auto other = others.lazy(open), more = others.lazy(open);
    sources.opened = 0;
    const auto finish = [](LazyDecoder& decoder) {
        decoder.deselect(1, 0);
        EXPECT_TRUE(decoder.isAwake());
        decoder.deselect(2, 0);
        EXPECT_FALSE(decoder.isAwake());
    };
    for (int i = 0; i < 5; ++i) first->readFrame(0);
    finish(*first);
    EXPECT_EQ(second->readFrame(0), 0);
    EXPECT_EQ(second->getFramePtr(0)->frameNr, 0);
    EXPECT_EQ(sources.opened, 1);
    first->select(1, 0);
    EXPECT_EQ(first->readFrame(0), 0);
    EXPECT_EQ(first->getFramePtr(0)->frameNr, 5);
    EXPECT_EQ(sources.opened, 2);
    finish(*second);
    EXPECT_EQ(other->readFrame(0), 0);
    EXPECT_TRUE(first->isAwake()) << "what nobody reads is closed first";
    EXPECT_EQ(sources.open, 1);
    EXPECT_EQ(more->readFrame(0), 0);
    EXPECT_FALSE(first->isAwake());
    EXPECT_EQ(third->readFrame(0), 0);
    EXPECT_EQ(third->getFramePtr(0)->frameNr, 0);
}

TEST(LazyDecoder, ASourceThatFailedIsNotTakenOver) {
    Sources sources;
    sources.failAt = 3;
    const auto open = std::make_shared<OpenDecoders>(4);
    const auto first = sources.lazy(open), second = sources.lazy(open);
    sources.opened = 0;
    for (int i = 0; i < 3; ++i) EXPECT_EQ(first->readFrame(0), 0);
    EXPECT_EQ(first->readFrame(0), QvStatus::failed);
    EXPECT_EQ(std::string(first->errorDesc()), "the disc is gone");
    first->deselect(1, 0);
    first->deselect(2, 0);
    EXPECT_EQ(second->readFrame(0), 0);
    EXPECT_EQ(sources.opened, 2);
}

TEST(LazyDecoder, UserDataAreAskedForWithoutOpeningTheSource) {
    Sources sources;
    const auto open = std::make_shared<OpenDecoders>(4);
    const auto wanting = sources.lazy(open), other = sources.lazy(open);
    sources.opened = 0;
    EXPECT_EQ(wanting->setReadUserData(1, 0, true), 0);
    EXPECT_TRUE(wanting->readUserData(1, 0));
    EXPECT_EQ(sources.opened, 0);
    for (int round = 0; round < 2; ++round)  // opened, then taken over from the other one
        for (LazyDecoder* decoder : {wanting.get(), other.get()}) {
            EXPECT_EQ(decoder->readFrame(0), 0);
            EXPECT_EQ(decoder->readUserData(1, 0), decoder == wanting.get());
            decoder->giveUp();
        }
    EXPECT_EQ(sources.opened, 1);
}

// What has changed the source can't be done again, so it stays open with the others.
TEST(LazyDecoder, AChangedSourceStaysOpen) {
    Sources sources;
    const auto others = std::make_shared<OpenDecoders>(1);
    const auto changed = sources.lazy(others), other = sources.lazy(others);
    EXPECT_EQ(changed->setParam("FOURCC", 5), 0);
    EXPECT_EQ(other->readFrame(0), 0);
    changed->rest();
    EXPECT_TRUE(changed->isAwake() && other->isAwake());
    EXPECT_EQ(others->count(), 1);
    changed->close();
    EXPECT_FALSE(changed->isAwake());
}

TEST(LazyDecoder, ASourceThatIsGoneIsAFailureOfTheRead) {
    Sources sources;
    const auto lazy = sources.lazy(std::make_shared<OpenDecoders>(2));
    sources.gone = true;
    EXPECT_EQ(lazy->readFrame(0), QvStatus::failed);
    EXPECT_EQ(std::string(lazy->errorDesc()), "Failed to open file 'a.x' using 'unnamed'.");
    EXPECT_EQ(lazy->readSamples(5, 0), QvStatus::failed);
    EXPECT_EQ(failureOf([&] { lazy->setParam("FOURCC", 5); }), "The input can't be opened any more");
    sources.gone = false;
    EXPECT_EQ(lazy->readFrame(0), 0);
}

}  // namespace

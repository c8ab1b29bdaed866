#include "builtin/decoders/videogenerator.h"

#include <algorithm>
#include <cstring>
#include <limits>
#include <new>

#include "builtin/decoders/testtext.h"
#include "core/arch/qvassert.h"
#include "core/engine/status.h"
#include "core/image/qvimage.h"
#include "core/value/ptrlist.h"

namespace {

constexpr int smallest = 32;
constexpr int maxViews = 10;

void copyPixels(const QvFrame& from, QvFrame& to) {
    QV_ASSERT(to.four_cc() == from.four_cc() && to.width() == from.width() && to.height() == from.height());
    for (int plane = 0; plane < from.planes(); ++plane) {
        QV_ASSERT(to.stride(plane) == from.stride(plane));
        std::memcpy(to.plane(plane), from.plane(plane), static_cast<std::size_t>(from.plane_bytes(plane)));
    }
}

}  // namespace

int VideoGenerator::init(const AnyDict& dict) {
    findTestFont();
    takeFramerate(dict["framerate"]);
    black_ = dict["content"] == "black";
    if (black_ || !dict["picture"].isValid()) {
        if (const int result = addPlain(dict); result != QvStatus::ok) return result;
    } else {
        addPictures(dict);
    }
    QV_ASSERT_MSG(!pictures_.empty(), "testgen: no pics loaded");
    takeAspect(dict["frameAspect"].isFloat() ? dict["frameAspect"].asDouble() : 0);
    QV_ASSERT_MSG(takeDuration(dict, "frames", framerate_), "testgen: duration not set");
    countFrames();
    describe();

    pictures_.front()->frameNr = 0;
    mode_ = dict["mode"];
    int views = dict.getInt32("nrViews", 1);
    if (views < 1 || views > maxViews) views = 1;
    params.set("nrViews", Any(views));
    text_ = makeTestText(pictures_.front()->height());
    drawCard();
    makeViews(views);
    renderNext();
    pending_ = true;
    return QvStatus::ok;
}

void VideoGenerator::close() {
    pictures_.clear();
    views_.clear();
    text_.reset();
    pending_ = false;
    params.clear();
}

// --- Setting up.

void VideoGenerator::takeFramerate(const Any& value) {
    QV_ASSERT_MSG(value.isFramerate() || value.isFloat(), "testgen: framerate not set");
    framerate_ = value.isFramerate() ? value.asFramerate() : QvFramerate(value.asDouble());
    framerate_.setDf(false);
}

int VideoGenerator::addPlain(const AnyDict& dict) {
    const int width = dict.getInt32("width", 0);
    const int height = dict.getInt32("height", 0);
    QV_ASSERT_MSG(black_ || width >= smallest || height >= smallest,
                  "testgen: No picture and invalid dimensions specified");
    auto frame = std::make_unique<QvFrame>();
    if (width < 1 || height < 1) return QvStatus::invalidStructure;
    if (const int result = frame->init(QvFourcc::BGR4, width, height); result != QvStatus::ok) return result;
    black_ ? frame->setRGB(0, 0, 0) : frame->setRGB(128, 128, 128);
    pictures_.push_back(std::move(frame));
    return QvStatus::ok;
}

void VideoGenerator::addPictures(const AnyDict& dict) {
    const Any& picture = dict["picture"];
    if (!picture.isVector()) return addPicture(picture);
    for (const Any& element : picture.asVector()) addPicture(element);
}

void VideoGenerator::addPicture(const Any& picture) {
    auto frame = std::make_unique<QvFrame>();
    if (picture.isText()) {
        if (QvImage::loadFrame(*frame, picture) != QvStatus::ok) return;
    } else {
        const bool pointer = picture.isGeneric() && picture.size() == 0 && picture.asGeneric();
        QV_ASSERT_MSG(pointer, "testgen: invalid picture data");
        const int result = frame->copy(*static_cast<const QvFrame*>(picture.asGeneric()));
        if (result == QvStatus::outOfMemory) throw std::bad_alloc();
    }
    if (frame->inited()) pictures_.push_back(std::move(frame));
}

void VideoGenerator::takeAspect(double aspect) {
    const QvFrame& picture = *pictures_.front();
    const double width = picture.width();
    const double height = picture.height();
    frameAspect_ = aspect > 0 ? aspect : width / height;
    pixelAspect_ = height * frameAspect_ / width;
    params.set("frameAspect", Any(frameAspect_));
    params.set("pixelAspect", Any(pixelAspect_));
}

void VideoGenerator::countFrames() {
    const long long frames = duration.position(framerate_);
    frames_ = static_cast<int>(std::clamp<long long>(frames, 0, std::numeric_limits<int>::max()));
    const double rate = framerate_.rate();
    params.set("framerate", Any(framerate_));
    params.set("pal", Any(static_cast<long long>(rate * 100) % 25 == 0 ? 1 : 0));
    params.set("frames", Any(frames_));
    params.set("duration", Any(duration.seconds()));
    params.set("vDuration", Any(duration.seconds()));
}

void VideoGenerator::describe() {
    const QvFrame& picture = *pictures_.front();
    params.set("codec", Any(picture.str_four_cc()));
    params.set("videoCodec", Any(picture.str_four_cc()));
    params.set("FOURCC", Any(static_cast<int>(picture.four_cc())));
    params.set("width", Any(picture.width()));
    params.set("height", Any(picture.height()));
}

void VideoGenerator::makeViews(int count) {
    TPtrList<QvFrame> chain;
    for (int i = 0; i < count; ++i) {
        views_.push_back(std::make_unique<QvFrame>(*pictures_.front()));
        if (!views_.back()->inited()) throw std::bad_alloc();
        views_.back()->frameNr = -1;
        views_.back()->framerate = framerate_;
        chain.append(views_.back().get());
    }
    QvFrame_linkViews(chain);
}

// --- Drawing.

void VideoGenerator::drawCard() {
    QvFrame& picture = *pictures_.front();
    picture.framerate = framerate_;
    if (black_) return;
    if (isGrayBar())
        drawGrayCard(picture);
    else
        drawTestCard(picture, frameAspect_, text_.get());
}

void VideoGenerator::showCard() {
    for (auto& view : views_) {
        copyPixels(*pictures_.front(), *view);
        view->framerate = framerate_;
    }
}

void VideoGenerator::drawMoving() {
    if (black_ || isGrayBar()) return;
    int nr = 0;
    for (auto& view : views_) drawMovingParts(*view, ++nr, text_.get());
}

void VideoGenerator::renderNext() {
    showCard();
    for (auto& view : views_)
        if (view->frameNr < std::numeric_limits<int>::max()) ++view->frameNr;
    drawMoving();
}

// --- Reading.

int VideoGenerator::readFrame() {
    if (pending_)
        pending_ = false;
    else
        renderNext();
    return QvStatus::ok;
}

void VideoGenerator::seekToFrame(int frame) {
    for (auto& view : views_) view->frameNr = frame - 1;
    renderNext();
    pending_ = true;
}

// --- Overrides.

void VideoGenerator::setDuration(const MediaTime& length) {
    duration = length;
    countFrames();
}

void VideoGenerator::setFrameAspect(double aspect) {
    takeAspect(aspect);
    drawCard();
    showCard();
    drawMoving();
}

void VideoGenerator::setFramerate(const QvFramerate& rate) {
    framerate_ = rate;
    countFrames();
    drawCard();
}

#include "tarsel/picture/picturereader.h"

#include "tarsel/words/messages.h"

namespace {

[[noreturn]] void failed(const Source& source, const std::string& reason) {
    throw failure(Msg::pictureFailed, {source.name(), reason});
}

}  // namespace

PictureReader::PictureReader(Source& source, const EffectOptions& options)
    : source_(source), effects_(options, pictureFormat(source, 0), true) {
    inFrames_ = frames_ = source.decoder().nrFrames(0);
    if (!options.any()) return;
    frames_ = QvRatio::multyplyByRatio(inFrames_, effects_.out().rate.rate(), effects_.in().rate.rate());
    pipe_ = tryPipe(effects_.job(effects_.filters(frames_, true)));
    for (int i = 0; pipe_ && i < pipe_->nrFilters(); ++i)
        if (!filterFile(*pipe_->filter(i), QV_GUI_FILESELECT_SAVE).empty())
            throw failure(Msg::filterWritesFile, {pipe_->filter(i)->name()});
    if (pipe_) reopen();
}

PictureReader::~PictureReader() {
    if (pipe_) pipe_->close();
}

void PictureReader::reopen() {
    pipe_->close();
    if (pipe_->open() != QvStatus::ok) failed(source_, pipe_->errorDesc());
    for (int i = 0; i < pipe_->nrFilters(); ++i) {
        if (pipe_->filter(i)->getParam("_isFramerateConverter").isTrue()) break;
        pipe_->filter(i)->setParam("_totalFrames", static_cast<int>(inFrames_));
    }
    nextInput_ = 0;
    holds_ = false;
}

const QvFrame& PictureReader::at(long long number) {
    if (!pipe_) return read(number);
    const QvFrame& picture = effects_.needsAllFrames() ? inOrder(number) : single(number);
    checkFilters();
    return picture;
}

const QvFrame& PictureReader::read(long long frame) {
    QvDecodePipe& decoder = source_.decoder();
    if (decoder.seekToFrame(frame, 0) != QvStatus::ok || decoder.readFrame(0) != QvStatus::ok)
        throw failure(Msg::frameReadFailed, {std::to_string(frame), source_.name()});
    if (onRead_) onRead_(frame);
    return *decoder.getFramePtr(0);
}

// Each frame stands for itself, so that the pipe gives one for one.
const QvFrame& PictureReader::single(long long number) {
    if (holds_) pipe_->next();
    nextInput_ = number;
    holds_ = advance();
    if (!holds_) failed(source_, "no frame came out of the filters");
    return *pipe_->frame();
}

const QvFrame& PictureReader::inOrder(long long number) {
    if (holds_ && pipe_->frame()->frameNr > number) reopen();
    while (!holds_ || pipe_->frame()->frameNr < number) {
        if (holds_) pipe_->next();
        holds_ = advance();
        if (!holds_) failed(source_, "no frame came out of the filters for this time");
    }
    return *pipe_->frame();
}

// Makes the next frame ready; false at the end of the source.
bool PictureReader::advance() {
    for (;;) {
        const int result = pipe_->process(nullptr, 0);
        if (result == QvStatus::ok) return true;
        if (result != QvStatus::needsInput) failed(source_, pipe_->errorDesc());
        if (nextInput_ >= inFrames_) return false;
        QvFrame& frame = const_cast<QvFrame&>(read(nextInput_++));
        if (pipe_->write(frame) != QvStatus::ok) checkFilters();
    }
}

void PictureReader::checkFilters() const {
    for (int i = 0; i < pipe_->nrFilters(); ++i)
        if (pipe_->filter(i)->errorCode() != 0)
            throw failure(Msg::filterFailed, {pipe_->filter(i)->name(), pipe_->filter(i)->errorDesc()});
}

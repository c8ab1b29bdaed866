// Frames that are files of one picture each: a001.jpg, a002.jpg and so on.
#pragma once

#include <memory>
#include <string>
#include <vector>

#include "core/measure/qvframerate.h"
#include "plugins/av/picture/framereader.h"

namespace av {

// The file and those that follow it by number, `count` in all. Empty if the name ends with no number that
// could be counted so far.
std::vector<std::string> numberedFrom(const std::string& first, int count);

class PictureFiles : public PictureSource {
  public:
    // Null with `reason`, a part of a sentence, if one of the files is missing or the first has no picture.
    static std::unique_ptr<PictureFiles> open(std::vector<std::string> files, const QvFramerate& rate,
                                              bool upright, std::string& reason);

    const PictureFormat& format() const override {
        return format_;
    }  // of the first; the others have to have it, too
    bool seek(int n) override;
    Read read() override;
    QvFrame& frame() override { return reader_->frame(); }
    const std::string& failure() const override { return failure_; }
    int concealed() const override { return 0; }

  private:
    std::vector<std::string> files_;
    bool upright_ = false;
    PictureFormat format_;
    std::unique_ptr<MediaBytes> bytes_;
    std::unique_ptr<FrameReader> reader_;  // of the picture that was read last
    std::size_t next_ = 0;
    std::string failure_;

    bool show(std::size_t n);
};

}  // namespace av

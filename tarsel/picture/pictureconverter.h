// Pictures of one source in another size and pixel format.
#pragma once

#include <memory>
#include <string>

#include <qvplugcore/qvplugcore.h>

#include "tarsel/host/memory.h"

class PictureConverter {
  public:
    // `option`: what the user gave that asks for it. Throws Failure, as convert does.
    PictureConverter(int width, int height, unsigned fourcc, const std::string& option);
    ~PictureConverter();
    PictureConverter(const PictureConverter&) = delete;
    PictureConverter& operator=(const PictureConverter&) = delete;

    // Valid until the next call.
    const QvFrame& convert(const QvFrame& from);

  private:
    [[noreturn]] void fail() const;

    std::unique_ptr<QvVideoFilter> scaler_;
    QvFrame in_, out_;
    MemoryWatch memory_;
};

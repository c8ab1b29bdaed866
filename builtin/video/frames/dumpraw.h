// The raw frame dump (module "rawdump"): writes each frame that passes to a file, for looking into a chain.
//
// Parameter "filename" (text): the file, which open makes anew. Until it is set it reads "set me", and open
// fails.
//
// The file holds the planes of the frames, one after the other, as in memory, with what pads their rows.
// Frames pass unchanged, also when the file can't be written: then that write or apply returns -1 with a line
// in the user log, nothing more is written, and close returns -1. Works in place. What is no file, such as a
// pipe, is written from its current position, and a stop of the run ends the wait for its reader.
#pragma once

#include <cstdio>
#include <memory>
#include <string>
#include <utility>

#include "builtin/video/inplaceeffect.h"
#include "core/arch/qvcancel.h"

struct DumpRawSettings {
    std::string filename = "set me";
};

class DumpRaw : public InPlaceEffectOf<DumpRawSettings>, public QvCancellable {
  public:
    DumpRaw();
    void getParam(const char* name, Any& value) const override;
    int open() override;
    int close() override;
    int write(QvFrame& frame) override;
    int apply(QvFrame& frame) override;
    void setCancel(std::shared_ptr<QvCancel> cancel) override { cancel_ = std::move(cancel); }

    using InPlaceEffectOf::getParam;

  protected:
    int change(const QvFrame& from, QvFrame& to) override;

  private:
    struct CloseFile {
        void operator()(std::FILE* file) const { std::fclose(file); }
    };

    int append(const QvFrame& frame);
    int writeFailed();

    std::unique_ptr<std::FILE, CloseFile> file_;
    std::shared_ptr<QvCancel> cancel_;
    bool failed_ = false;
};

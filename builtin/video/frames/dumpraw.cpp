#include "builtin/video/frames/dumpraw.h"

#include <cerrno>
#include <cstring>
#include <system_error>

#include "builtin/creators.h"
#include "core/arch/platform.h"
#include "core/engine/log/qvlog.h"
#include "core/measure/qvgeometry.h"

namespace {

constexpr QvParamRow<DumpRawSettings> rows[] = {
    {.name = "filename",
     .member = &DumpRawSettings::filename,
     .flags = qvParamStored,
     .help = "file that the planes of each frame are written to"},
};
static_assert(qvParamTableOk<DumpRawSettings>(rows));

}  // namespace

QvCodec* newRawdump() { return new DumpRaw; }

DumpRaw::DumpRaw() : InPlaceEffectOf("rawdump", rows) {}

int DumpRaw::open() {
    const std::string& name = settings_.filename;
    file_.reset();
    failed_ = false;
    bool isStream = false;
    if (name != DumpRawSettings().filename)
        file_.reset(qv_platform().openOutput(name.c_str(), cancel_, isStream));
    if (file_) {
        // A frame is written as a whole: what fails is reported with the frame and not later.
        std::setvbuf(file_.get(), nullptr, _IONBF, 0);
        return InPlaceEffectOf::open();
    }
    qv_dbg()->error("Raw dumper, failed to open %s, exiting.", name.c_str());
    if (name == DumpRawSettings().filename) return setError(QvStatus::failed, "'filename' names no file");
    return setError(QvStatus::failed, "the file %s of the raw dump can't be written", name.c_str());
}

void DumpRaw::getParam(const char* name, Any& value) const {
    if (std::strcmp(name, "paramSet") != 0) return InPlaceEffectOf::getParam(name, value);
    value = AnyVector(
        Any(QvProcessUtil::createParamDesc("filename", Any::String, QV_GUI_FILESELECT_SAVE, "Raw filename")));
}

int DumpRaw::close() {
    if (file_ && std::fclose(file_.release()) != 0) writeFailed();
    const int result = InPlaceEffectOf::close();
    return failed_ ? QvStatus::failed : result;
}

int DumpRaw::writeFailed() {
    const int error = errno != 0 ? errno : EIO;
    file_.reset();
    failed_ = true;
    qv_log()->error("[rawdump] fail to write to %s.", settings_.filename.c_str());
    return setError(QvStatus::failed, "fail to write to %s: %s", settings_.filename.c_str(),
                    std::generic_category().message(error).c_str());
}

int DumpRaw::append(const QvFrame& frame) {
    if (!file_) return QvStatus::ok;
    const auto bytes = static_cast<size_t>(frame.total_bytes());
    if (bytes == 0 || std::fwrite(frame.plane(), 1, bytes, file_.get()) == bytes) return QvStatus::ok;
    return writeFailed();
}

int DumpRaw::change(const QvFrame& from, QvFrame& to) {
    copySamples(to, from);
    return QvStatus::ok;
}

int DumpRaw::write(QvFrame& frame) {
    if (const int result = InPlaceEffectOf::write(frame)) return result;
    return append(frame);
}

int DumpRaw::apply(QvFrame& frame) {
    if (const int result = InPlaceEffectOf::apply(frame)) return result;
    return append(frame);
}

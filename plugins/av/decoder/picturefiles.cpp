#include "plugins/av/decoder/picturefiles.h"

#include <algorithm>
#include <cstdlib>

#include "core/engine/files/qvfileutil.h"
#include "core/media/qvframe.h"
#include "core/value/any.h"

namespace av {

std::vector<std::string> numberedFrom(const std::string& first, int count) {
    const std::size_t dot = std::min(first.rfind('.'), first.size());
    std::size_t digits = 0;
    while (digits < dot && first[dot - digits - 1] >= '0' && first[dot - digits - 1] <= '9') ++digits;
    constexpr std::size_t most = 18;
    if (digits == 0 || digits > most || count < 1) return {};
    const long long number = std::atoll(first.substr(dot - digits, digits).c_str());
    std::vector<std::string> files;
    for (int i = 0; i < count; ++i) {
        std::string text = std::to_string(number + i);
        if (text.size() < digits) text.insert(0, digits - text.size(), '0');
        files.push_back(first.substr(0, dot - digits) + text + first.substr(dot));
    }
    return files;
}

std::unique_ptr<PictureFiles> PictureFiles::open(std::vector<std::string> files, const QvFramerate& rate,
                                                 bool upright, std::string& reason) {
    for (const std::string& file : files)
        if (!QvFile::isFile(Any(file.c_str()))) {
            reason = "picture '" + file + "' is missing";
            return nullptr;
        }
    auto pictures = std::make_unique<PictureFiles>();
    pictures->files_ = std::move(files);
    pictures->upright_ = upright;
    if (!pictures->show(0)) {
        reason = pictures->failure_;
        return nullptr;
    }
    pictures->format_ = pictures->reader_->format();
    pictures->format_.rate = rate;
    pictures->format_.frames = static_cast<int>(pictures->files_.size());
    return pictures;
}

bool PictureFiles::show(std::size_t n) {
    const auto fail = [&](const std::string& why) {
        failure_ = "picture '" + files_[n] + "': " + why;
        return false;
    };
    reader_.reset();
    bytes_ = std::make_unique<MediaBytes>(Any(files_[n].c_str()));
    std::string reason;
    const auto input = MediaInput::open(*bytes_, "", reason);
    if (!input) return fail(reason);
    const std::shared_ptr<const PacketIndex> index = PacketIndex::build(*input, reason);
    if (!index) return fail(reason);
    auto reader = FrameReader::open(*bytes_, "", 0, index, {1, upright_}, reason);
    if (!reader) return fail(reason);
    if (reader->read() != FrameReader::Read::picture) return fail(reader->failure());
    const PictureFormat& one = reader->format();
    if (format_.frames > 0 &&
        (one.width != format_.width || one.height != format_.height || one.fourcc != format_.fourcc))
        return fail("it has another size or form than the first one");
    reader_ = std::move(reader);
    return true;
}

bool PictureFiles::seek(int n) {
    if (n < 0 || n > format_.frames) return false;
    next_ = static_cast<std::size_t>(n);
    return true;
}

PictureSource::Read PictureFiles::read() {
    if (next_ >= files_.size()) return Read::end;
    if (!show(next_)) return Read::failed;
    QvFrame& shown = reader_->frame();
    shown.framerate = QvFramerate(format_.rate.rate(), format_.fieldOrder);
    shown.frameNr = static_cast<int>(next_++);
    return Read::picture;
}

}  // namespace av

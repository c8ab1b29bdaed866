// Pictures and sound into an AVI file, against plain write of the same bytes; and how often a picture that an
// application pushes is copied on its way out.
#include <atomic>
#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <memory>

#include <dlfcn.h>
#include <fcntl.h>
#include <unistd.h>

#include "bench/ratio.h"
#include "core/encode/qvencodepipe.h"
#include "core/engine/modules/init.h"
#include "core/preset/qvprofile.h"
#include "core/transcode/push/pushencoder.h"
#include "tests/support/pictures.h"
#include "tests/support/temp_folder.h"

// Every copy of the process goes through these two, so that what is moved can be counted. Small ones, which
// are no pictures, are left out.
namespace {

using Mover = void* (*)(void*, const void*, std::size_t);
std::atomic<std::uint64_t> moved{0};
constexpr std::size_t smallest = 512;

void* move(const char* name, Mover& real, void* to, const void* from, std::size_t bytes) {
    if (!real) real = reinterpret_cast<Mover>(dlsym(RTLD_NEXT, name));
    if (bytes >= smallest) moved.fetch_add(bytes, std::memory_order_relaxed);
    return real(to, from, bytes);
}

}  // namespace

extern "C" void* memcpy(void* to, const void* from, std::size_t bytes) {
    static Mover real = nullptr;
    return move("memcpy", real, to, from, bytes);
}
extern "C" void* memmove(void* to, const void* from, std::size_t bytes) {
    static Mover real = nullptr;
    return move("memmove", real, to, from, bytes);
}

namespace {

constexpr int width = 1920, height = 1080, pictures = 24, samples = 1920;

void require(bool ok, const char* why) {
    if (ok) return;
    std::fprintf(stderr, "%s: the figures mean nothing\n", why);
    std::exit(1);
}

std::unique_ptr<QvEncodePipe> makePipe(unsigned type, const std::string& file, bool sound) {
    std::unique_ptr<QvEncodePipe> pipe(QvEncodePipe::create());
    require(pipe->applyPreset(QvProfile::aviRaw, 0) == 0, pipe->errorDesc());
    pipe->clearStreams();
    require(pipe->addVideoStream("rawvenc") == 0, pipe->errorDesc());
    pipe->setParam("video0", AnyDict("type", static_cast<int>(type), "width", width, "height", height));
    if (sound) require(pipe->addAudioStream("rawaenc") == 0, pipe->errorDesc());
    pipe->setFilename(Any(file.c_str()));
    return pipe;
}

void benchWriting(QvRatioBench& bench, const TempFolder& folder, unsigned type, const char* name) {
    const auto pipe = makePipe(type, folder.file("a.avi"), true);
    QvFrame frame = makePicture(type, width, height);
    QvPcm sound;
    fillSound(sound, samples, 2, 2, 48000);
    const auto pictureBytes = static_cast<std::size_t>(frame.total_bytes());
    const std::string plain = folder.file("plain");
    bench.compare(
        std::string("AVI, 1080p ") + name + " and sound : write", 1.2,
        [&] {
            require(pipe->open() == 0, pipe->errorDesc());
            for (int i = 0; i < pictures; ++i)
                require(pipe->writeFrame(&frame, 0) == 0 && pipe->writePcm(&sound, 0) == 0,
                        pipe->errorDesc());
            require(pipe->close() == 0, pipe->errorDesc());
        },
        [&] {
            const int file = open(plain.c_str(), O_WRONLY | O_CREAT | O_TRUNC, 0644);
            for (int i = 0; i < pictures; ++i)
                require(write(file, frame.plane(0), pictureBytes) == static_cast<ssize_t>(pictureBytes) &&
                            write(file, sound.ptr(0), samples * 4) == samples * 4,
                        "write failed");
            close(file);
        },
        15);
}

void countCopies() {
    constexpr int count = 100;
    const auto pipe = makePipe(QvFourcc::I420, "unused.avi", false);
    require(pipe->setSink("nullsink") == 0, pipe->errorDesc());
    QvPushEncoder push;
    push.setEncoder(pipe.get());
    AnyDict format("FOURCC", static_cast<int>(QvFourcc::I420), "width", width, "height", height, "framerate",
                   QvFramerate(25.0));
    require(push.addVideoStream(format, nullptr) == 0 && push.open() == 0 && push.start() == 0,
            push.errorDesc());
    QvFrame frame = makePicture(QvFourcc::I420, width, height);
    const std::uint64_t before = moved;
    for (int i = 0; i < count; ++i) {
        require(push.writeFrame(&frame, 0) == 0, push.errorDesc());
        push.process();
    }
    const double copies =
        static_cast<double>(moved - before) / count / static_cast<double>(frame.total_bytes());
    push.writeFrame(nullptr, 0);
    require(push.close(false) == 0 && pipe->close() == 0, push.errorDesc());
    QvRatioBench::tell("1080p I420 pushed, encoded raw, to the null sink (aim 3)", copies,
                       "copies a picture");
}

}  // namespace

int main() {
    init_wrapper(nullptr);
    {
        const TempFolder folder;
        QvRatioBench bench("AVI and push encoder");
        benchWriting(bench, folder, QvFourcc::I420, "I420");
        benchWriting(bench, folder, QvFourcc::UYVY, "UYVY");
        benchWriting(bench, folder, QvFourcc::BGR3, "BGR3, turned bottom-up");
        countCopies();
    }
    cleanup_wrapper();
    return 0;
}

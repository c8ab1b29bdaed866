// Reads sound that lies in memory, or comes from callbacks, and prints its length and its peak.
//
//     sound_from_memory call.wav [callbacks]
#include <algorithm>
#include <cstdio>
#include <cstring>
#include <memory>
#include <string>
#include <vector>

#include <qvplugcore/qvplugcore.h>

namespace {

// Stands for bytes that an application has from elsewhere.
std::vector<unsigned char> bytesOf(const char* name) {
    std::vector<unsigned char> bytes;
    if (std::FILE* file = std::fopen(name, "rb")) {
        for (int c; (c = std::getc(file)) != EOF;) bytes.push_back(static_cast<unsigned char>(c));
        std::fclose(file);
    }
    return bytes;
}

// The operations of a store of the application's own. Here the store is a vector; it outlives the source.
std::unique_ptr<QvByteSource> sourceOver(const std::vector<unsigned char>& store) {
    auto at = std::make_shared<std::size_t>(0);
    QvSourceCallbacks callbacks;
    callbacks.read = [&store, at](void* to, std::size_t count) -> long long {
        const std::size_t got = std::min(count, store.size() - std::min(*at, store.size()));
        if (got > 0) std::memcpy(to, store.data() + *at, got);
        *at += got;
        return static_cast<long long>(got);  // fewer are allowed; 0 is the end
    };
    callbacks.seek = [at](long long position) {
        *at = static_cast<std::size_t>(position);
        return true;
    };
    callbacks.size = [&store] { return static_cast<long long>(store.size()); };
    return qvCallbackSource(std::move(callbacks));
}

int measure(const char* name, bool callbacks) {
    const std::vector<unsigned char> bytes = bytesOf(name);
    Any error;
    // The name says by its extension what the bytes are. The decoder owns the source, and the source of a
    // block borrows the memory.
    const std::unique_ptr<QvDecodePipe> sound(
        QvDecFactory::decodeSource(callbacks ? sourceOver(bytes) : qvBlockSource(bytes.data(), bytes.size()),
                                   Any(name), AnyDict(), &error));
    if (!sound || sound->nrAudioStreams() == 0) {
        std::fprintf(stderr, "sound_from_memory: %s\n", sound ? "there is no sound" : error.asString(""));
        return 1;
    }
    sound->select(qvAudioStream, 0);
    const QvAudioStreamReport* report = sound->getAudioStreamReport(0);
    if (!report) {
        std::fprintf(stderr, "sound_from_memory: %s\n", sound->errorDesc());
        return 1;
    }
    const long long samples = sound->nrSamples(0);
    std::printf("%lld samples, peak %.1f dB\n", samples, report->peakdB(0, samples));
    return 0;
}

}  // namespace

int main(int argc, char** argv) {
    if (argc < 2) {
        std::fprintf(stderr, "usage: sound_from_memory FILE.wav [callbacks]\n");
        return 2;
    }
    init_wrapper(nullptr);
    const int result = measure(argv[1], argc > 2);
    cleanup_wrapper();
    return result;
}

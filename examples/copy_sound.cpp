// Copies the sound of a file: the smallest complete use of the engine.
//
//     copy_sound take.wav copy.wav
#include <cstdio>
#include <memory>

#include <qvplugcore/qvplugcore.h>

namespace {

int copySound(const char* from, const char* to) {
    std::unique_ptr<QvDecodePipe> source(QvDecFactory::decodePipe(Any(from)));
    if (!source || source->nrStreams(2) == 0) {
        std::fprintf(stderr, "no sound in %s\n", from);
        return 1;
    }
    source->select(2, 0);

    std::unique_ptr<QvEncodePipe> output(QvEncodePipe::create());
    output->clearStreams();
    output->addAudioStream(Any("rawaenc"));
    for (const char* name : {"samplerate", "channels", "bitsPerSample"})
        output->audioEncoder(0)->setParam(name, source->getAudioParam(0, name));
    output->setFilename(Any(to));

    QvTranscoder transcoder;
    transcoder.setEncoder(output.get());
    transcoder.setDecoder(source.get());
    transcoder.linkAll();
    if (transcoder.transcode(true) == QvStatus::ok) return 0;
    std::fprintf(stderr, "%s\n", transcoder.errorDesc());
    return 1;
}

}  // namespace

int main(int argc, char** argv) {
    if (argc != 3) {
        std::fprintf(stderr, "usage: copy_sound FROM TO\n");
        return 2;
    }
    init_wrapper(nullptr);
    const int result = copySound(argv[1], argv[2]);
    cleanup_wrapper();
    return result;
}

// The tool as a user runs it, from its start to its end, against ffmpeg at the same work where it is
// installed: 200 raw pictures of 1920 x 1080 on disk to 1280 x 720, and raw pictures to a PNG each; and a WAV
// file against cp.
#include <algorithm>
#include <cmath>
#include <cstdio>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <random>
#include <string>
#include <vector>

#include <sys/resource.h>

#include "bench/ratio.h"
#include "tests/support/temp_folder.h"
#include "tests/support/wav_bytes.h"

namespace {

constexpr int pictures = 200;

void writePictures(const std::string& name) {
    std::ofstream file(name, std::ios::binary);
    std::vector<char> picture(1920 * 1080 * 3 / 2);
    for (int n = 0; n < pictures; ++n) {
        for (size_t i = 0; i < picture.size(); ++i)
            picture[i] = static_cast<char>((i * 7 + i / 4096 * 13 + static_cast<size_t>(n)) & 255);
        file.write(picture.data(), static_cast<std::streamsize>(picture.size()));
    }
}

void run(const std::string& command) {
    if (std::system(command.c_str()) != 0) std::printf("failed: %s\n", command.c_str());
}

double processorSeconds() {
    rusage use{};
    getrusage(RUSAGE_CHILDREN, &use);
    const auto seconds = [](const timeval& t) {
        return static_cast<double>(t.tv_sec) + static_cast<double>(t.tv_usec) / 1e6;
    };
    return seconds(use.ru_utime) + seconds(use.ru_stime);
}

// A slope that moves, with grain, as films have it; or bars that move, as drawings have them.
void writeColours(const std::string& name, int count, bool film) {
    std::ofstream file(name, std::ios::binary);
    std::mt19937 random(1);
    std::normal_distribution<float> normal(0, 2);
    std::vector<int> grain(1 << 20);
    for (int& value : grain) value = static_cast<int>(std::lround(normal(random)));
    std::vector<char> picture(1920 * 1080 * 3);
    for (int n = 0; n < count; ++n) {
        size_t at = random() % grain.size();
        for (int y = 0, i = 0; y < 1080; ++y)
            for (int x = 0; x < 1920; ++x)
                for (int c = 0; c < 3; ++c, ++i) {
                    const int slope = (x + 3 * n) / 12 + y / (9 + c);
                    const int bars = ((x + 3 * n) / 240 * (c + 1) + y / 270) % 4 * 80;
                    const int value = film ? slope + grain[at++ % grain.size()] : bars;
                    picture[static_cast<size_t>(i)] = static_cast<char>(std::clamp(value, 0, 255));
                }
        file.write(picture.data(), static_cast<std::streamsize>(picture.size()));
    }
}

double megabytesIn(const std::string& folder) {
    double bytes = 0;
    for (const auto& entry : std::filesystem::directory_iterator(folder))
        bytes += static_cast<double>(entry.file_size());
    return bytes / 1e6;
}

// Ten minutes of 24 bits, 8 channels, copied by the tool and by cp, each time to a new file: cp would reuse
// the memory of one that is there, and the tool keeps that until the new one is complete.
void compareWav(const TempFolder& folder) {
    constexpr unsigned channels = 8, samples = 600 * 48000;
    const std::string in = folder.file("in.wav");
    {
        std::ofstream file(in, std::ios::binary);
        const std::string format = wavFormat(1, channels, 48000, 24);
        file << "RIFF" << leBytes(36 + samples * channels * 3, 4) << "WAVE" << wavChunk("fmt ", format)
             << "data" << leBytes(samples * channels * 3, 4);
        const std::string second = patternBytes(48000 * channels * 3);
        for (int i = 0; i < 600; ++i) file << second;
    }
    const std::string out = folder.file("out.wav");
    const std::string ours = QV_TOOL " transcode -q --no-sync '" + in + "' -o '" + out + "'";
    const std::string peer = "cp '" + in + "' '" + out + "'";
    const auto used = [&](const std::string& command) {
        std::filesystem::remove(out);
        const double before = processorSeconds();
        run(command);
        return processorSeconds() - before;
    };
    std::vector<double> ratios;
    for (int i = 0; i < 11; ++i) {
        const double cp = used(peer);
        ratios.push_back(used(ours) / cp);
    }
    std::sort(ratios.begin(), ratios.end());
    QvRatioBench::tell("WAV to WAV, 24 bits, 8 channels : cp, processor time", ratios[ratios.size() / 2],
                       "(aim 1.5)");
    QvRatioBench::tell("the least of the pairs", ratios.front(), "");
    QvRatioBench::tell("the most of the pairs", ratios.back(), "");
    for (const auto& name : {in, out}) std::filesystem::remove(name);
}

}  // namespace

int main() {
    const TempFolder folder;
    compareWav(folder);
    const std::string in = folder.file("in.yuv");
    writePictures(in);
    const std::string ours = QV_TOOL " transcode -q -y --no-sync --raw size=1920x1080,pixel=I420,rate=25 '" +
                             in + "' --size 1280x720 -o '" + (folder.file("ours.yuv")) + "'";
    const std::string peer =
        "ffmpeg -nostdin -v error -y -f rawvideo -pix_fmt yuv420p -s 1920x1080 -r 25 -i '" + in +
        "' -vf scale=1280:720:flags=bicubic -f rawvideo '" + (folder.file("peer.yuv")) + "'";
    QvRatioBench bench("200 pictures, 1920 x 1080 to 1280 x 720, on disk");
    if (std::system("command -v ffmpeg >/dev/null") != 0) {
        std::puts("ffmpeg is not installed");
        return 0;
    }
    double used[2] = {1e9, 1e9};
    const auto counted = [&](const std::string& command, double& least) {
        return [&] {
            const double before = processorSeconds();
            run(command);
            least = std::min(least, processorSeconds() - before);
        };
    };
    bench.compare("tarsel : ffmpeg, wall clock", 0.7, counted(ours, used[0]), counted(peer, used[1]), 5);
    std::printf("%-58s %10.0f ms %10.0f ms %8.2f\n", "processor time of all threads", used[0] * 1e3,
                used[1] * 1e3, used[0] / used[1]);

    for (const bool film : {true, false}) {
        const std::string title =
            std::string("30 pictures, 1920 x 1080, to PNG: ") + (film ? "film" : "bars");
        QvRatioBench pictures(title.c_str());
        const std::string colours = folder.file("colours.raw");
        writeColours(colours, 30, film);
        const std::string oursTo = folder.file("ours"), peersTo = folder.file("peers");
        for (const auto& made : {oursTo, peersTo}) std::filesystem::create_directory(made);
        const std::string oursPng = QV_TOOL
                                    " transcode -q -y --no-sync --raw size=1920x1080,pixel=BGR3,rate=25 '" +
                                    colours + "' -o '" + oursTo + "/p.png'";
        const std::string peersPng =
            "ffmpeg -nostdin -v error -y -f rawvideo -pix_fmt bgr24 -s 1920x1080 -r 25 -i '" + colours +
            "' '" + peersTo + "/p%03d.png'";
        double least[2] = {1e9, 1e9};
        pictures.compare("tarsel : ffmpeg, wall clock", 0.7, counted(oursPng, least[0]),
                         counted(peersPng, least[1]), 5);
        const double sizes[2] = {megabytesIn(oursTo), megabytesIn(peersTo)};
        std::printf("%-58s %10.0f ms %10.0f ms %8.2f\n", "processor time of all threads", least[0] * 1e3,
                    least[1] * 1e3, least[0] / least[1]);
        std::printf("%-58s %10.1f MB %10.1f MB %8.2f\n", "size of all files", sizes[0], sizes[1],
                    sizes[0] / sizes[1]);
    }
}

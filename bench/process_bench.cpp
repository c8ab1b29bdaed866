// The tool as a user runs it, from its start to its end: 200 raw pictures of 1920 x 1080 on disk to 1280 x
// 720, against ffmpeg at the same work where it is installed.
#include <algorithm>
#include <cstdio>
#include <cstdlib>
#include <fstream>
#include <string>
#include <vector>

#include <sys/resource.h>

#include "bench/ratio.h"
#include "tests/support/temp_folder.h"

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

}  // namespace

int main() {
    const TempFolder folder;
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
}

// SCC files: opening one compared with a grep process over it; dealing out captions compared with a copy.
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <fstream>
#include <string>
#include <vector>

#include <fcntl.h>
#include <sys/wait.h>
#include <unistd.h>

#include "bench/ratio.h"
#include "builtin/decoders/sccdec.h"

namespace {

// An hour of captions: 250 kB.
std::string captionFile() {
    const std::string name = "/tmp/caption-bench-" + std::to_string(getpid()) + ".scc";
    std::ofstream file(name, std::ios::binary);
    file << "Scenarist_SCC V1.0\r\n\r\n";
    for (int line = 0; file.tellp() < 250000; ++line) {
        char time[QvTimecode::textSize];
        QvTimecode(line * 90 + line % 7, QvFramerate::f29p(), false).pprint(time, false);
        file << time << "\t9420 9420 94ae 94ae 9454 9454";
        for (int word = 0; word < 35; ++word) file << (word % 2 ? " ef6d" : " 20ce");
        file << " 942c 942c 942f 942f\r\n\r\n";
    }
    return name;
}

void grep(const std::string& name) {
    const pid_t child = fork();
    if (child == 0) {
        const int nowhere = open("/dev/null", O_WRONLY);
        if (nowhere < 0 || dup2(nowhere, STDOUT_FILENO) < 0) _exit(1);
        execlp("grep", "grep", "-c", "942f", name.c_str(), static_cast<char*>(nullptr));
        _exit(127);
    }
    int status = 0;
    if (child < 0 || waitpid(child, &status, 0) != child || status != 0) std::abort();
}

}  // namespace

int main() {
    const std::string name = captionFile();
    QvRatioBench bench("captions");
    SccDec decoder;
    decoder.init();
    decoder.setParam("filename", name.c_str());
    bench.compare(
        "open an SCC file of 250 kB : grep process over it", 1.0,
        [&] {
            if (decoder.open() != 0) std::abort();
        },
        [&] { grep(name); });

    QvCcProcessor queue;
    queue.start(true, false, QvFramerate::f29p(), 3);
    QvCcData frame, dealt;
    frame.append(QvCcBytePair(0, 0x20, 0xCE, true));
    std::vector<QvCcBytePair> from(20), to(20);
    bench.compare(
        "queue and deal out a frame's 20 pairs : copy of 20 pairs", 40.0,
        [&] {
            queue.append(frame);
            queue.get(dealt, MediaTime());
        },
        [&] {
            std::memcpy(static_cast<void*>(to.data()), from.data(), 20 * sizeof(QvCcBytePair));
            benchmark::DoNotOptimize(to.data());
        });
    std::remove(name.c_str());
    return 0;
}

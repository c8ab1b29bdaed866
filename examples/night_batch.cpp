// Runs a list of tasks and prints what becomes of each. A line on the standard input ends the run.
//
//     night_batch list.xml
#include <atomic>
#include <chrono>
#include <cstdio>
#include <thread>

#include <poll.h>

#include <qvplugcore/qvplugcore.h>

namespace {

// All calls come from the thread that runs the tasks.
class Report : public QvBatchProcessCb {
  public:
    std::atomic<int> failed{0};

    int taskStarted(int task) override { return std::printf("task %d\n", task + 1); }
    int taskSkipped(int task) override { return std::printf("task %d is disabled\n", task + 1); }
    int progress(int, int, const AnyDict& info) override {
        return std::printf("%3.0f %%\n", info.getDouble("percent") * 100);
    }
    int taskFinished(int task, int code, const AnyDict& info) override {
        if (code != taskDone) ++failed;
        const char* how = code == taskDone ? "is done" : code == taskAborted ? "was stopped" : "failed";
        return std::printf("task %d %s. %s\n", task + 1, how, info.getString("msg", ""));
    }
};

bool lineWaits() {
    pollfd input{0, POLLIN, 0};
    return poll(&input, 1, 0) > 0 && (input.revents & POLLIN) != 0 && std::getchar() != EOF;
}

int runList(const char* file) {
    QvBatchList list;
    if (list.load(Any(file)) != QvStatus::ok) {
        std::fprintf(stderr, "%s is no list of tasks\n", file);
        return 2;
    }
    Report report;
    QvBatchProcessor processor;  // after the list and the report, which it uses to its end
    processor.setOptions(QvBatchTask::skipDisabled);
    processor.init(list);
    if (processor.start(false, &report) != QvStatus::ok) return 1;
    while (processor.isRunning()) {
        std::this_thread::sleep_for(std::chrono::milliseconds(100));
        if (lineWaits()) processor.stop();
    }
    processor.stop();  // waits for the last callback
    return report.failed > 0 ? 1 : 0;
}

}  // namespace

int main(int argc, char** argv) {
    if (argc != 2) {
        std::fprintf(stderr, "usage: night_batch LIST\n");
        return 2;
    }
    init_wrapper(nullptr);
    const int result = runList(argv[1]);
    cleanup_wrapper();
    return result;
}

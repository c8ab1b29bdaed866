// What values cost, each as a ratio to a yardstick measured in the same run:
//
//   restore_to_expat   reading a stored document of 20 MB to expat alone on the same bytes      aim 3 or less
//   store_to_restore   writing that document to reading it
//   get_to_map_find    AnyDict::get to std::map<std::string, int>::find with the key at hand    aim 1 or less
//   ns_per_copy        of an integer, and the allocations that a copy makes: about 1, and none
#include <benchmark/benchmark.h>

#include <algorithm>
#include <cstdio>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <map>
#include <new>
#include <string>
#include <vector>

#include <expat.h>
#include <time.h>
#include <unistd.h>

#include "core/document/xmldom.h"
#include "core/measure/qvgeometry.h"

namespace {

long long allocations = 0;  // the benchmarks run on one thread

}  // namespace

// Not inlined: GCC takes what it sees of one half for the wrong partner of the other.
[[gnu::noinline]] void* operator new(std::size_t size) {
    ++allocations;
    if (void* const memory = std::malloc(size ? size : 1)) return memory;
    throw std::bad_alloc();
}
[[gnu::noinline]] void operator delete(void* memory) noexcept { std::free(memory); }
[[gnu::noinline]] void operator delete(void* memory, std::size_t) noexcept { std::free(memory); }

namespace {

// Processor time of this thread, which other programs on the machine do not count in.
double now() {
    timespec time{};
    clock_gettime(CLOCK_THREAD_CPUTIME_ID, &time);
    return static_cast<double>(time.tv_sec) + static_cast<double>(time.tv_nsec) * 1e-9;
}

template <class Work>
double secondsOf(Work work) {
    const double start = now();
    work();
    return now() - start;
}

// A list of tasks as an application stores them: files, streams, filters with their parameters.
AnyDict taskOf(int number) {
    AnyDict task("__class__", "Task", "id", number, "state", "waiting");
    AnyVector& files = task.set("files", AnyVector()).asVector();
    files.append(Any::sprintf("/media/incoming/reel %d/camera a & b.mov", number));
    AnyVector& streams = task.set("streams", AnyVector()).asVector();
    for (int i = 0; i < 3; ++i) {
        AnyDict& stream = streams.append(AnyDict("type", 1 << i, "enabled", 1, "gain", i * 0.5));
        stream.set("framerate", QvFramerate::f29p());
        stream.set("in", MediaTime(35280000LL * number));
        stream.set("out", MediaTime(35280000LL * number + 1764000));
        stream.set("size", QvRect(0, 0, 1920, 1080));
        stream.set("bitrate", QvBitrate(1, 8000000, 0, 12000000));
        stream.set("title", Any(u"Aufnahme f\u00fcr Stra\u00dfe"));
        stream.set("_qualityThreshold", 1LL << 40);
    }
    return task;
}

class Document {
  public:
    static const Document& instance() {
        static const Document document;
        return document;
    }
    const std::string& file() const { return file_; }
    const AnyDict& dict() const { return dict_; }
    std::size_t size() const { return bytes_.size(); }

    double parsedByExpat() const {
        return secondsOf([&] {
            const XML_Parser parser = XML_ParserCreate(nullptr);
            XML_SetElementHandler(
                parser, [](void*, const char*, const char**) {}, [](void*, const char*) {});
            XML_SetCharacterDataHandler(parser, [](void*, const char*, int) {});
            constexpr std::size_t block = 64000;
            for (std::size_t at = 0; at < bytes_.size(); at += block) {
                const std::size_t size = std::min(block, bytes_.size() - at);
                XML_Parse(parser, bytes_.data() + at, static_cast<int>(size), at + size == bytes_.size());
            }
            XML_ParserFree(parser);
        });
    }

  private:
    Document() : file_(std::filesystem::temp_directory_path() / ("value-bench-" + std::to_string(getpid()))) {
        AnyVector& tasks = dict_.set("tasks", AnyVector()).asVector();
        for (int i = 0; i < 7500; ++i) tasks.append(taskOf(i));
        XmlParser::storeDict(file_.c_str(), dict_, "BatchList");
        std::ifstream in(file_, std::ios::binary);
        bytes_.assign(std::istreambuf_iterator<char>(in), {});
    }
    ~Document() { std::remove(file_.c_str()); }

    std::string file_;
    AnyDict dict_;
    std::string bytes_;
};

void restoreTo20MBExpat(benchmark::State& state) {
    const Document& document = Document::instance();
    double ours = 1e9, expat = 1e9, writing = 1e9;
    const std::string copy = document.file() + ".copy";
    for (auto _ : state) {
        AnyDict dict;
        Any root, version;
        ours = std::min(ours, secondsOf([&] {
                            if (XmlParser::restoreDict(document.file().c_str(), dict, root, version) != 0)
                                state.SkipWithError("not restored");
                        }));
        expat = std::min(expat, document.parsedByExpat());
        writing = std::min(
            writing, secondsOf([&] { XmlParser::storeDict(copy.c_str(), document.dict(), "BatchList"); }));
    }
    std::remove(copy.c_str());
    state.counters["MB"] = static_cast<double>(document.size()) * 1e-6;
    state.counters["restore_to_expat"] = ours / expat;
    state.counters["store_to_restore"] = writing / ours;
    state.counters["restore_MB_per_s"] = static_cast<double>(document.size()) * 1e-6 / ours;
}
BENCHMARK(restoreTo20MBExpat)->Iterations(7)->Unit(benchmark::kMillisecond);

// Keys as parameters have them: many begin alike.
std::vector<std::string> keysOf(int count) {
    static const char* const stems[] = {
        "framerate", "width",      "height",    "_position", "audio_channel",
        "bitrate",   "interlaced", "__class__", "filename",  "video_quality_mode"};
    std::vector<std::string> keys;
    for (int i = 0; i < count; ++i) keys.push_back(stems[i % 10] + (i < 10 ? "" : std::to_string(i / 10)));
    return keys;
}

void getToMapFind(benchmark::State& state) {
    const auto keys = keysOf(static_cast<int>(state.range(0)));
    AnyDict dict;
    std::map<std::string, int> map;
    for (const auto& key : keys) {
        dict.set(key.c_str(), 1);
        map[key] = 1;
    }
    constexpr int rounds = 200;
    double ours = 1e9, theirs = 1e9;
    for (auto _ : state) {
        long long sum = 0;
        ours = std::min(ours, secondsOf([&] {
                            for (int i = 0; i < rounds; ++i)
                                for (const auto& key : keys)
                                    sum += std::as_const(dict).get(key.c_str()).asInt32();
                        }));
        theirs = std::min(theirs, secondsOf([&] {
                              for (int i = 0; i < rounds; ++i)
                                  for (const auto& key : keys) sum += map.find(key)->second;
                          }));
        benchmark::DoNotOptimize(sum);
    }
    const double lookups = rounds * static_cast<double>(keys.size());
    state.counters["get_to_map_find"] = ours / theirs;
    state.counters["ns_per_get"] = ours / lookups * 1e9;
}
BENCHMARK(getToMapFind)->Arg(8)->Arg(40)->Arg(300)->Iterations(200);

void copyOfAnInteger(benchmark::State& state) {
    const Any value(42);
    constexpr int rounds = 100000;
    double best = 1e9;
    const long long before = allocations;
    for (auto _ : state)
        best = std::min(best, secondsOf([&] {
                            for (int i = 0; i < rounds; ++i) {
                                Any copy(value);
                                benchmark::DoNotOptimize(copy);
                            }
                        }));
    state.counters["ns_per_copy"] = best / rounds * 1e9;
    state.counters["allocations"] = static_cast<double>(allocations - before) / rounds;
}
BENCHMARK(copyOfAnInteger)->Iterations(50);

}  // namespace

BENCHMARK_MAIN();

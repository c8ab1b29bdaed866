// Two views as one picture, and as a chain, against copies of the same bytes.
#include <cstring>
#include <filesystem>
#include <fstream>
#include <memory>
#include <vector>

#include "bench/ratio.h"
#include "builtin/decoders/views/viewjoin.h"
#include "core/decode/qvdecoder.h"
#include "core/engine/modules/init.h"
#include "core/engine/modules/qvregistry.h"

namespace {

constexpr int width = 1920, height = 1080;

void compareJoin(QvRatioBench& bench, QvViewLayout layout) {
    QvFrame a, b, to;
    a.init(QvFourcc::I420, width, height);
    b.init(QvFourcc::I420, width, height);
    const bool across = layout == QvViewLayout::sideBySide;
    to.init(QvFourcc::I420, across ? 2 * width : width, across ? height : 2 * height);
    QvFrame* const views[] = {&a, &b};
    std::vector<unsigned char> copy(static_cast<std::size_t>(a.total_bytes()) * 2);
    const auto bytes = static_cast<std::size_t>(a.total_bytes());
    bench.compare(
        std::string("join, ") + QvViewSetup::layoutName(layout), 1.2, [&] { qvJoinViews(layout, views, to); },
        [&] {
            std::memcpy(copy.data(), a.plane(0), bytes);
            std::memcpy(copy.data() + bytes, b.plane(0), bytes);
        });
}

// The whole decoder against reading both files by themselves.
void compareDecoder(QvRatioBench& bench, const std::string& file, QvViewLayout layout, double aim) {
    const auto raw = [&](QvDecodePipe& decoder) -> QvDecodePipe& {
        decoder.setParam("FOURCC", "I420");
        decoder.setParam("width", width);
        decoder.setParam("height", height);
        decoder.setParam("filename", file.c_str());
        return decoder;
    };
    const auto make = [](const char* module) {
        return std::unique_ptr<QvDecodePipe>(static_cast<QvDecodePipe*>(qv_registry()->newCodec(module)));
    };
    const auto left = make("rawdec"), right = make("rawdec"), views = make("mvmetadec");
    QvViewSetup setup;
    setup.layout = layout;
    setup.views.resize(2);
    for (auto& view : setup.views) {
        view.file = file.c_str();
        raw(*left).store(view.state);
    }
    AnyDict state;
    setup.store(state);
    views->setParam("metaState", state);
    raw(*right);
    if (left->open() || right->open() || views->open()) return;
    const auto next = [](QvDecodePipe& decoder) {
        if (decoder.readFrame(0) != 0) {
            decoder.seekToFrame(0, 0);
            decoder.readFrame(0);
        }
    };
    bench.compare(
        std::string("decoder, ") + QvViewSetup::layoutName(layout), aim, [&] { next(*views); },
        [&] {
            next(*left);
            next(*right);
        });
}

}  // namespace

int main() {
    QvRatioBench bench("two views of 1920x1080 I420 : memcpy of both, or both read alone",
                       QvBenchClock::thread);
    for (const auto layout : {QvViewLayout::sideBySide, QvViewLayout::topBottom, QvViewLayout::lineByLine})
        compareJoin(bench, layout);
    init_wrapper(nullptr);
    const std::string file = (std::filesystem::temp_directory_path() / "views_bench.yuv").string();
    std::ofstream(file, std::ios::binary) << std::string(std::size_t{width} * height * 3 / 2 * 8, 'x');
    compareDecoder(bench, file, QvViewLayout::interleaved, 1.1);
    compareDecoder(bench, file, QvViewLayout::sideBySide, 2.2);
    std::filesystem::remove(file);
    cleanup_wrapper();
}

#include "core/stream/file/blockmove_p.h"

#include <algorithm>
#include <cerrno>
#include <limits>

#include "core/stream/platformblock_p.h"
#include "core/stream/stdfile_p.h"

namespace {

constexpr uint64_t pieceBytes = 1 << 20;
constexpr uint64_t smallFile = 5120;

bool readAt(StdFile& file, uint64_t position, unsigned char* data, uint64_t bytes) {
    return file.seek(static_cast<long long>(position), SEEK_SET) && file.readAll(data, bytes);
}

bool writeAt(StdFile& file, uint64_t position, const unsigned char* data, uint64_t bytes) {
    return file.seek(static_cast<long long>(position), SEEK_SET) && file.write(data, bytes);
}

// Sizes that add up to no file, and a body that does not end where the block begins, would overwrite what
// they do not name.
bool consistent(const BufReorderInfo& order, uint64_t fileBytes) {
    const auto inside = [&](const BufExtent& e) {
        return e.position <= fileBytes && e.size <= fileBytes - e.position;
    };
    return inside(order.head) && inside(order.block) && inside(order.body) &&
           order.body.position + order.body.size == order.block.position &&
           order.head.size + order.body.size == order.block.position;
}

// From its end on, so that no byte is overwritten before it has been moved.
bool moveBody(StdFile& file, const BufReorderInfo& order, unsigned char* piece) {
    uint64_t left = order.body.size;
    while (left) {
        const uint64_t bytes = std::min(left, pieceBytes);
        left -= bytes;
        if (!readAt(file, order.body.position + left, piece, bytes)) return false;
        if (!writeAt(file, order.head.size + order.block.size + left, piece, bytes)) return false;
    }
    return true;
}

bool move(StdFile& file, const BufReorderInfo& order) {
    const PlatformBlock piece(pieceBytes);
    const PlatformBlock block(order.block.size);
    if (!piece.data() || !block.data()) return false;
    return readAt(file, order.block.position, block.data(), order.block.size) &&
           moveBody(file, order, piece.data()) &&
           writeAt(file, order.head.size, block.data(), order.block.size);
}

}  // namespace

void moveBlock(const QvWideString& name, const BufReorderInfo& order, QvIoFailure& failure) {
    const char* what = "Failed to move the index to the front of";
    StdFile file;
    if (!file.open(name, "r+b")) return failure.note(file.error(), what, name);
    const uint64_t fileBytes = static_cast<uint64_t>(std::max(file.length(), 0LL));
    if (!consistent(order, fileBytes)) return failure.note(EINVAL, what, name);
    const uint64_t total = order.head.size + order.block.size + order.body.size;
    if (total <= smallFile || order.block.position < pieceBytes) return;
    bool ok = move(file, order);
    if (!file.close()) ok = false;
    if (!ok) failure.note(file.error() ? file.error() : ENOMEM, what, name);
}

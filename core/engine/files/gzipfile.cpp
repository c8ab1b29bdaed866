#include "core/engine/files/gzipfile_p.h"

#include <zlib.h>
#include <algorithm>
#include <limits>
#include <memory>
#include <new>
#include <vector>

#include "core/arch/platform.h"
#include "core/engine/files/qvfileutil.h"

namespace {

constexpr std::size_t blockSize = 204'800;

// An open gzip file; null if the name does not open. Closing it is part of writing it.
gzFile openGzip(const Any& name, bool writing) {
    const std::string file = qv_os_name(name);
    const int descriptor = file.empty() ? -1 : qv_platform().openDescriptor(file.c_str(), writing);
    if (descriptor < 0) return nullptr;
    const gzFile stream = gzdopen(descriptor, writing ? "wb" : "rb");
    if (!stream) qv_platform().closeDescriptor(descriptor);
    return stream;
}

bool readAll(gzFile file, std::vector<char>& bytes) {
    constexpr std::size_t most = std::numeric_limits<int>::max();
    while (true) {
        const std::size_t start = bytes.size();
        bytes.resize(start + blockSize);
        const int count = gzread(file, bytes.data() + start, static_cast<unsigned>(blockSize));
        if (count < 0) return false;
        bytes.resize(start + static_cast<std::size_t>(count));
        if (bytes.size() > most) return false;
        if (static_cast<std::size_t>(count) < blockSize) return true;
    }
}

}  // namespace

int qvWriteGzip(const Any& name, const unsigned char* data, int size) {
    if (size < 0 || (size > 0 && !data)) return -1;
    const gzFile file = openGzip(name, true);
    if (!file) return -1;
    const bool whole = size == 0 || gzwrite(file, data, static_cast<unsigned>(size)) == size;
    return gzclose(file) == Z_OK && whole ? 0 : -1;
}

int qvReadGzip(const Any& name, Any& out) {
    out.invalidate();
    const gzFile file = openGzip(name, false);
    if (!file) return -1;
    std::vector<char> bytes;
    bool whole = false;
    try {
        // The library returns a file that is not gzip unchanged; here that is a damaged one.
        whole = readAll(file, bytes) && (bytes.empty() || !gzdirect(file));
    } catch (const std::bad_alloc&) {
    }
    // Closing reports a stream that ended early.
    if (gzclose(file) != Z_OK || !whole) return -1;
    if (!bytes.empty()) out.set(static_cast<const void*>(bytes.data()), static_cast<int>(bytes.size()));
    return 0;
}

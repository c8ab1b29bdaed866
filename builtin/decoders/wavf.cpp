#include "builtin/decoders/wavf.h"

#include <algorithm>
#include <array>
#include <cstdint>
#include <cstring>
#include <limits>
#include <vector>

#include "builtin/decoders/inputfile.h"

namespace {

constexpr int extensibleTag = 65534;
constexpr int maxChunksBeforeFormat = 100000;
// Ids and text after the format are searched for "data" at this many places, the first of them three bytes
// before the end of the format's fields.
constexpr int dataTries = 100000;
constexpr std::uint32_t takenFromDs64 = 0xFFFFFFFF;

using Id = std::array<char, 4>;

bool operator==(const Id& id, const char* text) { return std::memcmp(id.data(), text, id.size()) == 0; }

std::uint32_t u16(const unsigned char* p) { return static_cast<std::uint32_t>(p[0] | p[1] << 8); }
std::uint32_t u32(const unsigned char* p) { return u16(p) | u16(p + 2) << 16; }
std::uint64_t u64(const unsigned char* p) { return u32(p) | static_cast<std::uint64_t>(u32(p + 4)) << 32; }

struct Chunk {
    Id id{};
    std::uint32_t size = 0;
};

class HeaderReader {
  public:
    HeaderReader(InputFile& file, WavHeader& header) : file_(file), header_(header) {}

    WavStatus read();

  private:
    InputFile& file_;
    WavHeader& header_;
    Chunk riff_;
    Id form_{};
    std::uint64_t riffSize64_ = 0;
    std::uint64_t dataSize64_ = 0;
    long long formatFieldsEnd_ = 0;
    long long formatEnd_ = 0;
    int subFormat_ = 0;
    int blockAlign_ = 0;
    std::uint32_t dataSize_ = 0;

    bool isRf64() const { return riff_.id == "RF64" || riff_.id == "BW64"; }
    bool bytesAt(long long position, void* to, std::size_t count) {
        return file_.seek(position) && file_.read(to, 1, count) == count;
    }
    bool chunkAt(long long position, Chunk& chunk);
    long long behindChunk(long long position, const Chunk& chunk);
    bool readDs64(long long position, std::uint32_t size);
    WavStatus findFormat();
    bool readFormat(long long position, std::uint32_t size);
    bool findData();
    bool findDataByChunks();
    bool findDataBySearch();
    bool takeDataAt(long long position);
    WavStatus checkFormat() const;
    void measure();
    bool sizeIsUnknown(std::uint32_t size, long long present);
    bool chunksFillTheRest(long long position);
};

bool HeaderReader::chunkAt(long long position, Chunk& chunk) {
    unsigned char bytes[8];
    if (!bytesAt(position, bytes, sizeof bytes)) return false;
    std::memcpy(chunk.id.data(), bytes, chunk.id.size());
    chunk.size = u32(bytes + 4);
    return true;
}

// Where the next chunk begins. Some writers forget the padding of an odd chunk.
long long HeaderReader::behindChunk(long long position, const Chunk& chunk) {
    const long long end = position + 8 + chunk.size;
    if (chunk.size % 2 == 0) return end;
    Chunk next;
    const bool unpadded = chunkAt(end, next) && (next.id == "fmt " || next.id == "data");
    return unpadded ? end : end + 1;
}

bool HeaderReader::readDs64(long long position, std::uint32_t size) {
    unsigned char bytes[16];
    if (size < sizeof bytes || !bytesAt(position, bytes, sizeof bytes)) return false;
    riffSize64_ = u64(bytes);
    dataSize64_ = u64(bytes + 8);
    return true;
}

WavStatus HeaderReader::findFormat() {
    unsigned char bytes[12];
    if (!bytesAt(0, bytes, sizeof bytes)) return WavStatus::cannotParse;
    std::memcpy(riff_.id.data(), bytes, 4);
    riff_.size = u32(bytes + 4);
    std::memcpy(form_.data(), bytes + 8, 4);

    long long position = 12;
    for (int i = 0; i < maxChunksBeforeFormat; ++i) {
        Chunk chunk;
        if (!chunkAt(position, chunk) || static_cast<std::int32_t>(chunk.size) < 1) break;
        if (chunk.id == "fmt ") {
            formatEnd_ = behindChunk(position, chunk);
            return readFormat(position + 8, chunk.size) ? WavStatus::ok : WavStatus::cannotParse;
        }
        if (isRf64() && chunk.id == "ds64" && !readDs64(position + 8, chunk.size)) break;
        position = behindChunk(position, chunk);
    }
    return WavStatus::cannotParse;
}

// Fields of the format, by their offset:
//     0 tag  2 channels  4 samples a second  8 bytes a second  12 bytes a sample  14 bits a value
//     16 size of what follows  18 valid bits  20 channel mask  24 sub-format tag, the start of a GUID
bool HeaderReader::readFormat(long long position, std::uint32_t size) {
    constexpr std::uint32_t plainBytes = 16;
    constexpr std::uint32_t extensionBytes = 22;
    unsigned char bytes[plainBytes + 2 + extensionBytes];
    if (size < plainBytes || !bytesAt(position, bytes, plainBytes)) return false;
    formatFieldsEnd_ = position + plainBytes;
    header_.formatTag = static_cast<int>(u16(bytes));
    header_.channels = static_cast<int>(u16(bytes + 2));
    header_.samplerate = static_cast<int>(u32(bytes + 4));
    blockAlign_ = static_cast<int>(u16(bytes + 12));
    header_.bitsPerSample = static_cast<int>(u16(bytes + 14));
    if (header_.formatTag == 1 || size < sizeof bytes) return true;
    if (!bytesAt(position, bytes, sizeof bytes)) return false;
    if (u16(bytes + 16) != extensionBytes) return true;
    formatFieldsEnd_ = position + static_cast<long long>(sizeof bytes);
    if (header_.formatTag == extensibleTag) header_.channelMask = u32(bytes + 20);
    subFormat_ = static_cast<int>(u16(bytes + 24));
    return true;
}

bool HeaderReader::takeDataAt(long long position) {
    Chunk chunk;
    if (!chunkAt(position, chunk)) return false;
    dataSize_ = chunk.size;
    header_.dataOffset = position + 8;
    return true;
}

// A text inside a chunk may well hold the word, so the chunks are followed first.
bool HeaderReader::findData() { return findDataByChunks() || findDataBySearch(); }

bool HeaderReader::findDataByChunks() {
    const long long last = formatFieldsEnd_ - 3 + dataTries - 1;
    Chunk chunk;
    for (long long position = formatEnd_; position <= last && chunkAt(position, chunk);
         position = behindChunk(position, chunk))
        if (chunk.id == "data") return takeDataAt(position);
    return false;
}

bool HeaderReader::findDataBySearch() {
    const long long first = formatFieldsEnd_ - 3;
    std::vector<char> bytes(dataTries + 3);
    if (!file_.seek(first)) return false;
    const std::size_t count = file_.read(bytes.data(), 1, bytes.size());
    const auto end = bytes.begin() + static_cast<std::ptrdiff_t>(count);
    const char word[] = {'d', 'a', 't', 'a'};
    const auto found = std::search(bytes.begin(), end, std::begin(word), std::end(word));
    return found != end && takeDataAt(first + (found - bytes.begin()));
}

WavStatus HeaderReader::checkFormat() const {
    const bool pcm = header_.formatTag == 1 || (header_.formatTag == extensibleTag && subFormat_ == 1);
    if (!pcm) return WavStatus::notPcm;
    const bool width =
        header_.bitsPerSample == 8 || header_.bitsPerSample == 16 || header_.bitsPerSample == 24;
    if (!width || header_.channels < 1 || header_.channels > 8 || header_.samplerate < 1)
        return WavStatus::badFormat;
    // Values in wider containers, as 24 bits in four bytes; read as packed they would be noise.
    const bool padded = blockAlign_ > header_.frameBytes() && blockAlign_ % header_.channels == 0;
    return padded ? WavStatus::badFormat : WavStatus::ok;
}

// Whole chunks from here to the end of the file: then an empty "data" chunk is meant as it stands.
bool HeaderReader::chunksFillTheRest(long long position) {
    Chunk chunk;
    for (int i = 0; i < maxChunksBeforeFormat && chunkAt(position, chunk); ++i)
        position = behindChunk(position, chunk);
    return position == file_.length();
}

// Sizes left by recorders that could not go back to the header, as they are or cut to whole samples, and
// 32-bit sizes that a file beyond 4 GiB has overrun.
bool HeaderReader::sizeIsUnknown(std::uint32_t size, long long present) {
    constexpr std::uint32_t unpatched[] = {0xFFFFFFFF, 0x80000000, 0x7FFFFFFF, 0x7FFFF000};
    if (size == 0) return !chunksFillTheRest(header_.dataOffset);
    const auto frame = static_cast<std::uint32_t>(header_.frameBytes());
    for (const std::uint32_t size32 : unpatched)
        if (size > present && (size == size32 || size == size32 - size32 % frame)) return true;
    return present > std::numeric_limits<std::uint32_t>::max() && static_cast<std::uint32_t>(present) == size;
}

void HeaderReader::measure() {
    constexpr std::uint64_t most = std::numeric_limits<long long>::max();
    const long long present = std::max(file_.length() - header_.dataOffset, 0LL);
    const bool from64 = isRf64() && dataSize_ == takenFromDs64 && dataSize64_ > 0 && dataSize64_ <= most;
    const bool unknown = !from64 && sizeIsUnknown(dataSize_, present);
    long long announced = dataSize_;
    if (from64) announced = static_cast<long long>(dataSize64_);
    if (unknown) announced = present;
    const int valueBytes = header_.bitsPerSample / 8;
    header_.samples = std::min(announced, present) / valueBytes / header_.channels;
    header_.samplesAnnounced = announced / valueBytes / header_.channels;

    const std::uint64_t riffSize = isRf64() && riffSize64_ > 0 ? riffSize64_ : riff_.size;
    header_.fileSize = file_.length();
    if (!unknown && riffSize < static_cast<std::uint64_t>(file_.length()))
        header_.fileSize = std::min(header_.fileSize, static_cast<long long>(riffSize) + 8);
}

WavStatus HeaderReader::read() {
    if (const auto status = findFormat(); status != WavStatus::ok) return status;
    if (!(form_ == "WAVE") || !(riff_.id == "RIFF" || isRf64())) return WavStatus::cannotParse;
    if (!findData()) return WavStatus::noData;
    if (const auto status = checkFormat(); status != WavStatus::ok) return status;
    measure();
    return WavStatus::ok;
}

}  // namespace

WavStatus readWavHeader(InputFile& file, WavHeader& header) {
    header = WavHeader();
    return HeaderReader(file, header).read();
}

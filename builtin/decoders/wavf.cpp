#include "builtin/decoders/wavf.h"

#include <algorithm>
#include <array>
#include <cstdint>
#include <cstring>
#include <limits>
#include <utility>

#include "builtin/decoders/inputfile.h"

namespace {

constexpr int extensibleTag = 65534;
constexpr int maxChunks = 100000;
// Ids and text after the format are searched for "data" at this many places, the first of them three bytes
// before the end of the format's fields.
constexpr int dataTries = 100000;
constexpr std::uint32_t takenFromDs64 = 0xFFFFFFFF;

using Id = std::array<char, 4>;

bool operator==(const Id& id, const char* text) { return std::memcmp(id.data(), text, id.size()) == 0; }

// Numbers of a file: little-endian but for "RIFX".
struct Numbers {
    bool bigEndian = false;

    std::uint32_t u16(const unsigned char* p) const {
        return static_cast<std::uint32_t>(bigEndian ? p[0] << 8 | p[1] : p[0] | p[1] << 8);
    }
    std::uint32_t u32(const unsigned char* p) const {
        return bigEndian ? u16(p) << 16 | u16(p + 2) : u16(p) | u16(p + 2) << 16;
    }
    // Of little-endian files alone.
    std::uint64_t u64(const unsigned char* p) const {
        return u32(p) | static_cast<std::uint64_t>(u32(p + 4)) << 32;
    }
};

struct Chunk {
    Id id{};
    std::uint32_t size = 0;
};

class ChunkReader {
  public:
    ChunkReader(InputFile& file, bool bigEndian) : file_(file), numbers_{bigEndian} {}

    bool bytesAt(long long position, void* to, std::size_t count) {
        return file_.seek(position) && file_.read(to, 1, count) == count;
    }
    bool chunkAt(long long position, Chunk& chunk);
    long long afterChunk(long long position, const Chunk& chunk);

  protected:
    InputFile& file_;
    Numbers numbers_;
};

class HeaderReader : private ChunkReader {
  public:
    HeaderReader(InputFile& file, WavHeader& header, bool extended)
        : ChunkReader(file, false), header_(header), extended_(extended) {}

    WavStatus read();

  private:
    WavHeader& header_;
    bool extended_;
    Chunk riff_;
    Id form_{};
    std::uint64_t riffSize64_ = 0;
    std::uint64_t dataSize64_ = 0;
    long long formatFieldsEnd_ = 0;
    long long formatEnd_ = 0;
    int subFormat_ = 0;
    int blockAlign_ = 0;
    std::uint32_t dataSize_ = 0;

    bool isRf64() const { return extended_ && (riff_.id == "RF64" || riff_.id == "BW64"); }
    bool isRifx() const { return extended_ && riff_.id == "RIFX"; }
    bool readDs64(long long position, std::uint32_t size);
    WavStatus findFormat();
    bool readFormat(long long position, std::uint32_t size);
    bool findData();
    bool findDataByChunks();
    bool findDataBySearch();
    bool takeDataAt(long long position);
    WavStatus chooseCoding();
    WavStatus checkFormat();
    bool isWidth() const;
    void measure();
    bool sizeIsUnknown(std::uint32_t size, long long present);
    bool chunksFillTheRest(long long position);
};

bool ChunkReader::chunkAt(long long position, Chunk& chunk) {
    unsigned char bytes[8];
    if (!bytesAt(position, bytes, sizeof bytes)) return false;
    std::memcpy(chunk.id.data(), bytes, chunk.id.size());
    chunk.size = numbers_.u32(bytes + 4);
    return true;
}

// Where the next chunk begins. Some writers forget the padding of an odd chunk.
long long ChunkReader::afterChunk(long long position, const Chunk& chunk) {
    const long long end = position + 8 + chunk.size;
    if (chunk.size % 2 == 0) return end;
    Chunk next;
    const bool unpadded = chunkAt(end, next) && (next.id == "fmt " || next.id == "data");
    return unpadded ? end : end + 1;
}

bool HeaderReader::readDs64(long long position, std::uint32_t size) {
    unsigned char bytes[16];
    if (size < sizeof bytes || !bytesAt(position, bytes, sizeof bytes)) return false;
    riffSize64_ = numbers_.u64(bytes);
    dataSize64_ = numbers_.u64(bytes + 8);
    return true;
}

WavStatus HeaderReader::findFormat() {
    unsigned char bytes[12];
    if (!bytesAt(0, bytes, sizeof bytes)) return WavStatus::cannotParse;
    std::memcpy(riff_.id.data(), bytes, 4);
    header_.bigEndian = numbers_.bigEndian = isRifx();
    riff_.size = numbers_.u32(bytes + 4);
    std::memcpy(form_.data(), bytes + 8, 4);

    long long position = 12;
    for (int i = 0; i < maxChunks; ++i) {
        Chunk chunk;
        const int smallest = extended_ ? 0 : 1;
        if (!chunkAt(position, chunk) || static_cast<std::int32_t>(chunk.size) < smallest) break;
        if (chunk.id == "fmt ") {
            formatEnd_ = afterChunk(position, chunk);
            return readFormat(position + 8, chunk.size) ? WavStatus::ok : WavStatus::cannotParse;
        }
        if (isRf64() && chunk.id == "ds64" && !readDs64(position + 8, chunk.size)) break;
        position = afterChunk(position, chunk);
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
    header_.formatTag = static_cast<int>(numbers_.u16(bytes));
    header_.channels = static_cast<int>(numbers_.u16(bytes + 2));
    header_.samplerate = static_cast<int>(numbers_.u32(bytes + 4));
    blockAlign_ = static_cast<int>(numbers_.u16(bytes + 12));
    header_.bitsPerSample = static_cast<int>(numbers_.u16(bytes + 14));
    if (header_.formatTag == 1 || size < sizeof bytes) return true;
    if (!bytesAt(position, bytes, sizeof bytes)) return false;
    if (numbers_.u16(bytes + 16) != extensionBytes) return true;
    formatFieldsEnd_ = position + static_cast<long long>(sizeof bytes);
    if (header_.formatTag == extensibleTag) header_.channelMask = numbers_.u32(bytes + 20);
    subFormat_ = static_cast<int>(numbers_.u16(bytes + 24));
    // The GUID begins with a number of 32 bits. Some writers of big-endian files take it for one of 16, or
    // leave it little-endian.
    if (header_.bigEndian && subFormat_ == 0) subFormat_ = static_cast<int>(numbers_.u16(bytes + 26));
    if (header_.bigEndian && (subFormat_ & 0xFF) == 0) subFormat_ >>= 8;
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
    const long long last = extended_ ? file_.length() : formatFieldsEnd_ - 3 + dataTries - 1;
    long long position = formatEnd_;
    Chunk chunk;
    for (int i = 0; i < maxChunks && position <= last && chunkAt(position, chunk); ++i) {
        if (chunk.id == "data") return takeDataAt(position);
        position = afterChunk(position, chunk);
    }
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

WavStatus HeaderReader::chooseCoding() {
    constexpr int pcmTag = 1, floatTag = 3, aLawTag = 6, muLawTag = 7;
    const int tag = header_.formatTag == extensibleTag ? subFormat_ : header_.formatTag;
    if (tag != pcmTag && !extended_) return WavStatus::notPcm;
    switch (tag) {
        case pcmTag: header_.coding = WavCoding::integer; return WavStatus::ok;
        case floatTag: header_.coding = WavCoding::floating; return WavStatus::ok;
        case aLawTag: header_.coding = WavCoding::aLaw; return WavStatus::ok;
        case muLawTag: header_.coding = WavCoding::muLaw; return WavStatus::ok;
        default: return WavStatus::notPcm;
    }
}

bool HeaderReader::isWidth() const {
    const int bits = header_.bitsPerSample;
    if (!extended_) return bits == 8 || bits == 16 || bits == 24;
    switch (header_.coding) {
        case WavCoding::integer: return bits >= 1 && bits <= 32;
        case WavCoding::floating: return bits == 32 || bits == 64;
        default: return bits == 8;
    }
}

WavStatus HeaderReader::checkFormat() {
    if (const auto status = chooseCoding(); status != WavStatus::ok) return status;
    const int most = extended_ ? wavMostChannels : 8;
    if (!isWidth() || header_.channels < 1 || header_.channels > most || header_.samplerate < 1)
        return WavStatus::badFormat;
    // Values in wider containers, as 24 bits in four bytes; read as packed they would be noise.
    const bool padded = blockAlign_ > header_.frameBytes() && blockAlign_ % header_.channels == 0;
    return padded ? WavStatus::badFormat : WavStatus::ok;
}

// Whole chunks from here to the end of the file: then an empty "data" chunk is meant so.
bool HeaderReader::chunksFillTheRest(long long position) {
    Chunk chunk;
    for (int i = 0; i < maxChunks && chunkAt(position, chunk); ++i) position = afterChunk(position, chunk);
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
    const long long held = std::min(announced, present);
    header_.samples = held / header_.valueBytes() / header_.channels;
    header_.samplesAnnounced = announced / header_.valueBytes() / header_.channels;
    header_.dataEnd = header_.dataOffset + held;

    const std::uint64_t riffSize = isRf64() && riffSize64_ > 0 ? riffSize64_ : riff_.size;
    header_.fileSize = file_.length();
    if (!unknown && riffSize < static_cast<std::uint64_t>(file_.length()))
        header_.fileSize = std::min(header_.fileSize, static_cast<long long>(riffSize) + 8);
}

WavStatus HeaderReader::read() {
    if (const auto status = findFormat(); status != WavStatus::ok) return status;
    if (!(form_ == "WAVE") || !(riff_.id == "RIFF" || isRf64() || isRifx())) return WavStatus::cannotParse;
    if (!findData()) return WavStatus::noData;
    if (const auto status = checkFormat(); status != WavStatus::ok) return status;
    measure();
    return WavStatus::ok;
}

// --- Chunks around the samples.

constexpr int mostChunks = 10000;
constexpr std::size_t mostKept = std::size_t{16} << 20;

bool isPlausible(const Id& id) {
    return std::all_of(id.begin(), id.end(), [](char c) { return c >= ' ' && c <= '~'; });
}

// Chunks that describe this very file, or only fill space: they are not copied to others.
bool isOfTheFile(const Id& id) {
    constexpr const char* own[] = {"fmt ", "fact", "data", "ds64", "PEAK", "JUNK",
                                   "junk", "FLLR", "PAD ", "fill", "levl"};
    return std::any_of(std::begin(own), std::end(own), [&](const char* name) { return id == name; });
}

class ChunkCollector : private ChunkReader {
  public:
    ChunkCollector(InputFile& file, const WavHeader& header, std::vector<WavChunk>& kept,
                   std::vector<std::string>& others)
        : ChunkReader(file, header.bigEndian), kept_(kept), others_(others) {}

    // Collects chunks from `position` up to `end`, or up to something that is no chunk.
    void collect(long long position, long long end) {
        for (Chunk chunk; left_ > 0 && position + 8 <= end && chunkAt(position, chunk); --left_) {
            if (!isPlausible(chunk.id) || chunk.id == "data" || position + 8 + chunk.size > end) return;
            if (!isOfTheFile(chunk.id)) take(position + 8, chunk);
            position = afterChunk(position, chunk);
        }
    }
    bool isChunkAt(long long position) {
        Chunk chunk;
        return chunkAt(position, chunk) && isPlausible(chunk.id);
    }

  private:
    std::vector<WavChunk>& kept_;
    std::vector<std::string>& others_;
    int left_ = mostChunks;
    std::size_t room_ = mostKept;

    bool isKept(long long contents, const Chunk& chunk) {
        if (chunk.size == 0 || chunk.size > room_) return false;
        if (numbers_.bigEndian || chunk.id == "iXML") return chunk.id == "iXML";
        Id kind;
        if (chunk.id == "LIST")
            return chunk.size >= kind.size() && bytesAt(contents, kind.data(), kind.size()) &&
                   (kind == "INFO" || kind == "adtl");
        return chunk.id == "bext" || chunk.id == "cue ";
    }
    void take(long long contents, const Chunk& chunk) {
        const std::string id(chunk.id.begin(), chunk.id.end());
        std::string data;
        if (isKept(contents, chunk)) {
            data.resize(chunk.size);
            if (bytesAt(contents, data.data(), data.size())) {
                room_ -= data.size();
                kept_.push_back({id, std::move(data)});
                return;
            }
        }
        if (std::find(others_.begin(), others_.end(), id) == others_.end()) others_.push_back(id);
    }
};

}  // namespace

WavStatus readWavHeader(InputFile& file, WavHeader& header, bool extended) {
    header = WavHeader();
    return HeaderReader(file, header, extended).read();
}

void readWavChunks(InputFile& file, const WavHeader& header, std::vector<WavChunk>& kept,
                   std::vector<std::string>& others) {
    ChunkCollector collector(file, header, kept, others);
    collector.collect(12, header.dataOffset - 8);
    // Some writers forget the padding of odd data.
    const long long padded = header.dataEnd + (header.dataEnd - header.dataOffset) % 2;
    collector.collect(collector.isChunkAt(padded) ? padded : header.dataEnd, file.length());
}

#include "builtin/muxers/rawavimuxfile.h"

#include <algorithm>
#include <array>
#include <cerrno>
#include <climits>
#include <numeric>

#include "builtin/muxers/rawavimuxbytes.h"
#include "core/stream/qvbufstrm.h"

namespace {

constexpr int64_t chunkHead = 8;
constexpr int64_t indexHead = 32;  // of "ix##", its chunk head included
constexpr int64_t indexEntry = 8;
constexpr int64_t oldIndexEntry = 16;
constexpr unsigned keyFrame = 0x10;
constexpr unsigned indexOfChunks = 1;  // kinds of OpenDML index
constexpr unsigned indexOfIndexes = 0;
constexpr size_t firstEntries = 4096;
constexpr const char* dataId[] = {"##wb", "##db"};

constexpr unsigned hasIndex = 0x10, isInterleaved = 0x100, trustChunkTypes = 0x800;

}  // namespace

bool AviFile::fail(int code, const char* problem) {
    if (errorCode_ == 0) {
        errorCode_ = code != 0 ? code : EIO;
        problem_ = problem;
    }
    return false;
}

bool AviFile::open(QvBufStream& output, std::vector<AviTrack> tracks, const Limits& limits) {
    *this = AviFile();
    output_ = &output;
    tracks_ = std::move(tracks);
    limits_ = limits;
    entries_.reserve(firstEntries);
    const auto bytes = header();
    moviStart_ = static_cast<int64_t>(bytes.size()) - 4;
    segments_ = 1;
    return put(bytes.data(), bytes.size());
}

bool AviFile::put(const unsigned char* data, size_t bytes) {
    constexpr size_t piece = 1u << 30;  // counts of the output are 32 bits
    if (errorCode_ != 0) return false;
    auto* out = output_->input();
    if (!out) return fail(EIO, "There is no output for");
    while (bytes > 0) {
        const auto now = static_cast<unsigned>(std::min(bytes, piece));
        if (out->copybytes(out, const_cast<unsigned char*>(data), now) != now)
            return fail(output_->ioError(), "Failed to write to");
        data += now;
        bytes -= now;
        position_ += now;
    }
    return true;
}

// Goes into the output's buffer, for which nothing has to be written at once.
bool AviFile::putHead(const unsigned char* data, unsigned bytes) {
    if (errorCode_ != 0) return false;
    auto* out = output_->input();
    auto* block = out ? out->request(out, bytes) : nullptr;
    if (!block) return put(data, bytes);
    std::copy(data, data + bytes, block);
    if (out->confirm(out, bytes) != bytes) return fail(output_->ioError(), "Failed to write to");
    position_ += bytes;
    return true;
}

bool AviFile::correct(int64_t position, const std::vector<unsigned char>& bytes) {
    auto* out = output_->input();
    BufSeekInfo change{position, bytes.data(), static_cast<uint32_t>(bytes.size())};
    if (out->auxinfo(out, 0, QvAuxId::BUF_SEEK_INFO, &change, sizeof change) != 0)
        return fail(ESPIPE, "Can not go back to the headers of");
    return true;
}

// --- Chunks.

int64_t AviFile::indexBytes(size_t entries) const {
    const auto count = static_cast<int64_t>(entries);
    const auto all = static_cast<int64_t>(tracks_.size()) * indexHead + count * indexEntry;
    return segments_ == 1 ? all + chunkHead + count * oldIndexEntry : all;
}

bool AviFile::beginChunk(size_t track, uint32_t bytes, int64_t units) {
    if (errorCode_ != 0) return false;
    const int64_t end = position_ - segmentStart_ + chunkHead + bytes + bytes % 2;
    if (!entries_.empty() && end + indexBytes(entries_.size() + 1) > limits_.segmentBytes && !nextSegment())
        return false;
    auto& into = tracks_[track];
    entries_.push_back(
        {static_cast<uint32_t>(track), static_cast<uint32_t>(position_ - segmentStart_), bytes});
    into.units += units;
    into.segmentUnits += units;
    into.largestChunk = std::max(into.largestChunk, bytes);
    chunkBytes_ = bytes;
    std::array<unsigned char, chunkHead> head;
    const char* kind = into.video ? "db" : "wb";
    head[0] = static_cast<unsigned char>('0' + track / 10);
    head[1] = static_cast<unsigned char>('0' + track % 10);
    head[2] = static_cast<unsigned char>(kind[0]);
    head[3] = static_cast<unsigned char>(kind[1]);
    for (unsigned i = 0; i < 4; ++i) head[4 + i] = static_cast<unsigned char>(bytes >> 8 * i);
    return putHead(head.data(), chunkHead);
}

bool AviFile::endChunk() {
    constexpr unsigned char padding = 0;
    return chunkBytes_ % 2 == 0 || put(&padding, 1);
}

// --- Segments.

bool AviFile::nextSegment() {
    // The last segment that the header can name stays finished, so that closing makes a whole file.
    if (segments_ == limits_.segments) return fail(EFBIG, "The index is full of");
    if (!finishSegment()) return false;
    segmentStart_ = position_;
    ++segments_;
    AviBytes head;
    head.text("RIFF").u32(0).text("AVIX").text("LIST").u32(0).text("movi");
    moviStart_ = segmentStart_ + static_cast<int64_t>(head.size()) - 4;
    const auto bytes = head.take();
    return put(bytes.data(), bytes.size());
}

bool AviFile::finishSegment() {
    if (!writeIndexes()) return false;
    const int64_t moviBytes = position_ - moviStart_;
    if (segments_ == 1 && !writeOldIndex()) return false;
    const int64_t riffBytes = position_ - segmentStart_ - chunkHead;
    entries_.clear();
    for (auto& track : tracks_) {
        if (segments_ == 1 && track.video && firstUnits_ == 0) firstUnits_ = track.segmentUnits;
        track.segmentUnits = 0;
    }
    if (segments_ == 1) {
        firstRiffBytes_ = static_cast<uint32_t>(riffBytes);
        firstMoviBytes_ = static_cast<uint32_t>(moviBytes);
        return true;  // with the headers, at the end
    }
    AviBytes head;
    head.text("RIFF").u32(riffBytes).text("AVIX").text("LIST").u32(moviBytes).text("movi");
    return correct(segmentStart_, head.take());
}

bool AviFile::writeIndexes() {
    for (size_t number = 0; number < tracks_.size(); ++number) {
        auto& track = tracks_[number];
        const auto count = std::count_if(entries_.begin(), entries_.end(),
                                         [number](const Entry& e) { return e.track == number; });
        if (count == 0) continue;
        AviBytes index;
        index.streamId("ix##", number).u32(indexHead - chunkHead + count * indexEntry);
        index.u16(indexEntry / 4).u16(indexOfChunks << 8).u32(count);
        index.streamId(dataId[track.video], number).u64(segmentStart_).u32(0);
        for (const auto& entry : entries_)
            if (entry.track == number) index.u32(entry.offset + chunkHead).u32(entry.bytes);
        track.index.push_back(
            {position_, static_cast<uint32_t>(index.size()), static_cast<uint32_t>(track.segmentUnits)});
        const auto bytes = index.take();
        if (!put(bytes.data(), bytes.size())) return false;
    }
    return true;
}

// The index of old readers, which know the first segment only.
bool AviFile::writeOldIndex() {
    AviBytes index;
    const size_t start = index.open("idx1");
    const auto toMovi = static_cast<uint32_t>(moviStart_ - segmentStart_);
    for (const auto& entry : entries_) {
        index.streamId(dataId[tracks_[entry.track].video], entry.track);
        index.u32(keyFrame).u32(entry.offset - toMovi).u32(entry.bytes);
    }
    index.close(start);
    const auto bytes = index.take();
    return put(bytes.data(), bytes.size());
}

bool AviFile::close() { return errorCode_ == 0 && finishSegment() && correct(0, header()); }

// --- Headers, always of the same length for the same streams.

std::vector<unsigned char> AviFile::header() const {
    const AviTrack* video = nullptr;
    int64_t perSecond = 0;
    uint32_t largest = 0;
    for (const auto& track : tracks_) {
        const int64_t unit = track.video ? track.largestChunk : track.unitBytes;
        perSecond += unit * track.rate / track.scale;
        largest = std::max(largest, track.largestChunk);
        if (track.video && !video) video = &track;
    }
    AviBytes to;
    to.text("RIFF").u32(firstRiffBytes_).text("AVI ");
    const size_t headers = to.openList("LIST", "hdrl");
    const size_t main = to.open("avih");
    to.u32(video ? (int64_t{1000000} * video->scale + video->rate / 2) / video->rate : 0);
    to.u32(std::min<int64_t>(perSecond, UINT32_MAX)).u32(0);
    to.u32(hasIndex | isInterleaved | trustChunkTypes);
    to.u32(firstUnits_).u32(0).u32(static_cast<int64_t>(tracks_.size())).u32(largest + chunkHead);
    to.u32(video ? video->width : 0).u32(video ? video->height : 0).zeros(16);
    to.close(main);
    for (size_t i = 0; i < tracks_.size(); ++i) putStream(to, i);
    const size_t extension = to.openList("LIST", "odml");
    const size_t total = to.open("dmlh");
    to.u32(video ? video->units : 0).zeros(244);
    to.close(total);
    to.close(extension);
    to.close(headers);
    to.text("LIST").u32(firstMoviBytes_).text("movi");
    return to.take();
}

void AviFile::putStream(AviBytes& to, size_t number) const {
    const auto& track = tracks_[number];
    const size_t list = to.openList("LIST", "strl");
    const size_t head = to.open("strh");
    if (track.video)
        to.text("vids");
    else
        to.text("auds");
    to.u32(track.handler).zeros(12).u32(track.scale).u32(track.rate).u32(0);
    to.u32(track.units).u32(track.largestChunk).u32(-1).u32(track.unitBytes).u16(0).u16(0);
    to.u16(std::min(track.width, SHRT_MAX)).u16(std::min(track.height, SHRT_MAX));
    to.close(head);
    const size_t format = to.open("strf");
    to.bytes(track.format);
    to.close(format);
    if (track.video) putPictureShape(to, track);
    const size_t places = to.open("indx");
    to.u16(oldIndexEntry / 4).u16(indexOfIndexes << 8).u32(static_cast<int64_t>(track.index.size()));
    to.streamId(dataId[track.video], number).zeros(12);
    for (const auto& place : track.index) to.u64(place.position).u32(place.bytes).u32(place.units);
    to.zeros((static_cast<size_t>(limits_.segments) - track.index.size()) * oldIndexEntry);
    to.close(places);
    to.close(list);
}

// Square pixels, and which lines belong to which field. Both lengths of the aspect have 16 bits.
void AviFile::putPictureShape(AviBytes& to, const AviTrack& track) {
    int across = track.width / std::gcd(track.width, track.height);
    int down = track.height / std::gcd(track.width, track.height);
    while (std::max(across, down) > UINT16_MAX) {
        across = std::max(across / 2, 1);
        down = std::max(down / 2, 1);
    }
    const int fields = track.interlaced == 0 ? 1 : 2;
    const int64_t refresh = (int64_t{track.rate} * fields + track.scale / 2) / track.scale;
    const size_t shape = to.open("vprp");
    to.u32(0).u32(0).u32(refresh).u32(track.width).u32(track.height);
    to.u16(down).u16(across).u32(track.width).u32(track.height).u32(fields);
    for (int field = 0; field < fields; ++field) {
        const bool upper = fields == 1 || (field == 0) == (track.interlaced == 1);
        const int lines = fields == 1 ? track.height : (track.height + upper) / 2;
        to.u32(lines).u32(track.width).u32(lines).u32(track.width).zeros(12).u32(upper ? 0 : 1);
    }
    to.close(shape);
}

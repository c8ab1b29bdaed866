#include "plugins/av/mux/unitlog.h"

#include <algorithm>
#include <array>
#include <cstring>
#include <new>
#include <utility>

extern "C" {
#include <libavutil/mem.h>
#include <libavutil/murmur3.h>
}

#include "core/stream/qvbufstrm.h"
#include "core/stream/qvbytesource.h"

namespace av {

namespace {

// The file: the mark, entries, and an end with the digest of all that is before it. Numbers are in the byte
// order of the machine, as the records in the entries are.
constexpr std::array<std::uint8_t, 8> mark{'Q', 'V', 'U', 'N', 'I', 'T', 'S', '1'};
constexpr std::uint16_t endType = 0xFFFF;
constexpr std::size_t mostInfo = 4096, mostBytes = std::size_t{64} << 20;
constexpr std::size_t readAhead = std::size_t{256} << 10;

struct EntryHead {
    std::uint16_t type, number;
    std::uint32_t id, infoBytes, dataBytes;
};
static_assert(sizeof(EntryHead) == 16);

template <class T>
std::span<const std::uint8_t> bytesOf(const T& value) {
    return {reinterpret_cast<const std::uint8_t*>(&value), sizeof value};
}

}  // namespace

void UnitDigest::Free::operator()(AVMurMur3* context) const { av_free(context); }

UnitDigest::UnitDigest() : context_(av_murmur3_alloc()) {
    if (!context_) throw std::bad_alloc();
    av_murmur3_init(context_.get());
}

void UnitDigest::add(std::span<const std::uint8_t> bytes) {
    av_murmur3_update(context_.get(), bytes.data(), bytes.size());
}

std::vector<std::uint8_t> UnitDigest::finish() {
    std::vector<std::uint8_t> digest(kBytes);
    av_murmur3_final(context_.get(), digest.data());
    return digest;
}

// --- Writing.

UnitLog::UnitLog(QvBufStream& output) : output_(output) {}

int UnitLog::error() const { return output_.ioError(); }

bool UnitLog::put(std::span<const std::uint8_t> bytes) {
    if (!problem_.empty() || bytes.empty()) return problem_.empty();
    digest_.add(bytes);
    bufstream* const out = output_.input();
    const auto count = static_cast<unsigned>(bytes.size());
    if (out && out->copybytes(out, const_cast<std::uint8_t*>(bytes.data()), count) == count) return true;
    problem_ = output_.ioErrorText();
    if (problem_.empty()) problem_ = "The output takes no more";
    return false;
}

bool UnitLog::begin() { return std::exchange(begun_, true) || put(mark); }

bool UnitLog::add(const UnitLogEntry& entry) {
    const std::lock_guard guard(lock_);
    const EntryHead head{static_cast<std::uint16_t>(entry.type), static_cast<std::uint16_t>(entry.number),
                         entry.id, static_cast<std::uint32_t>(entry.info.size()),
                         static_cast<std::uint32_t>(entry.bytes.size())};
    return begin() && put(bytesOf(head)) && put(entry.info) && put(entry.bytes);
}

bool UnitLog::finish() {
    const std::lock_guard guard(lock_);
    const EntryHead head{endType, 0, 0, UnitDigest::kBytes, 0};
    return begin() && put(bytesOf(head)) && put(digest_.finish());
}

// --- Reading.

UnitLogReader::UnitLogReader() = default;

UnitLogReader::~UnitLogReader() = default;

std::string UnitLogReader::open(const Any& file) {
    problem_.clear();
    digest_ = std::make_unique<UnitDigest>();
    source_ = qvFileSource(file, readAhead);
    std::array<std::uint8_t, mark.size()> found{};
    if (!source_) return "it can't be opened";
    if (!take(found.data(), found.size())) return problem_;
    return found == mark ? "" : "it has no recorded units";
}

UnitLogReader::Read UnitLogReader::fail(const std::string& why) {
    problem_ = why;
    return Read::failed;
}

bool UnitLogReader::take(void* to, std::size_t bytes) {
    if (source_->read(to, bytes) != bytes) {
        problem_ = source_->problem().empty() ? "it ends too early" : source_->problem();
        return false;
    }
    digest_->add({static_cast<const std::uint8_t*>(to), bytes});
    return true;
}

bool UnitLogReader::take(std::vector<std::uint8_t>& to, std::size_t bytes) {
    to.resize(bytes);
    return bytes == 0 || take(to.data(), bytes);
}

UnitLogReader::Read UnitLogReader::atEnd() {
    const std::vector<std::uint8_t> wanted = digest_->finish();
    std::vector<std::uint8_t> found(wanted.size() + 1);
    const std::size_t read = source_->read(found.data(), found.size());
    if (read < wanted.size())
        return fail(source_->problem().empty() ? "it ends too early" : source_->problem());
    const bool same = read == wanted.size() && std::equal(wanted.begin(), wanted.end(), found.begin());
    return same ? Read::end : fail("it was changed after it was written");
}

UnitLogReader::Read UnitLogReader::next(int type, int number, UnitLogEntry& entry) {
    for (;;) {
        EntryHead head{};
        if (!take(&head, sizeof head)) return Read::failed;
        if (head.type == endType) return atEnd();
        if (head.infoBytes > mostInfo || head.dataBytes > mostBytes)
            return fail("an entry has an impossible size");
        if (!take(entry.info, head.infoBytes) || !take(entry.bytes, head.dataBytes)) return Read::failed;
        entry.type = head.type;
        entry.number = head.number;
        entry.id = head.id;
        if (entry.type == type && entry.number == number) return Read::entry;
    }
}

}  // namespace av

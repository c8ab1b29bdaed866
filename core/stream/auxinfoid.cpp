#include "core/stream/auxinfoid.h"

#include <algorithm>
#include <iterator>

namespace {

using namespace QvAuxId;

struct Row {
    unsigned id;
    const char* name;
};

#define ROW(id) \
    { id, #id }

// In ascending order.
constexpr Row rows[] = {
    ROW(ID_PICTURE_START_CODE),
    ROW(ID_SLICE_MIN_START),
    ROW(ID_USER_START_CODE),
    ROW(ID_SEQ_START_CODE),
    ROW(ID_EXT_START_CODE),
    ROW(ID_SEQ_END_CODE),
    ROW(ID_GOP_START_CODE),
    ROW(ID_ISO_END_CODE),
    ROW(ID_PACK_START_CODE),
    ROW(ID_SYSTEM_START_CODE),
    ROW(ID_PREFIX_START_CODE),
    ROW(TS_MICROMV),
    ROW(TS_DVB),
    ROW(TS_DVHS),
    ROW(BUF_SEEK_INFO),
    ROW(BUF_SEEK_SAMPLE_INFO),
    ROW(BUF_SEEK_STREAM_INFO),
    ROW(BUF_SEEK_UPDATE_SETTINGS),
    ROW(BUF_SEEK_RESET),
    ROW(BUF_SEEK_REMOVE_STREAM),
    ROW(BUF_SEEK_INIT_OUTPUT),
    ROW(BUF_SEEK_MSTART),
    ROW(BUF_SEEK_REORDER),
    ROW(UNSPECIFIED_AU),
    ROW(VIDEO_AU_CODE),
    ROW(AUDIO_AU_CODE),
    ROW(SP_AU_CODE),
    ROW(VIDEO_AU_START),
    ROW(BYTECOUNT_INFO),
    ROW(FLUSH_BUFFER),
    ROW(SPLIT_OUTPUT),
    ROW(STREAM_END_CODE),
    ROW(VIDEO_STREAM_INFO),
    ROW(VIDEO_AU_INFO),
    ROW(AUDIO_STREAM_INFO),
    ROW(AUDIO_AU_INFO),
    ROW(TIME_STAMP_INFO),
    ROW(STATISTIC_INFO),
    ROW(CPB_FULLNESS),
    ROW(TIMECODE_BREAK),
    ROW(SAMPLE_INFO),
    ROW(MUX_STATISTIC_INFO),
    ROW(DD_STREAM_INFO),
    ROW(DMFA_STREAM_INFO),
    ROW(DMFV_STREAM_INFO),
    ROW(ACCESS_INFO),
    ROW(STREAM_FORMAT_INFO),
    ROW(AUDIO_SYNC_CODE),
};

#undef ROW

static_assert(std::size(rows) == 48);
static_assert(std::is_sorted(std::begin(rows), std::end(rows),
                             [](const Row& a, const Row& b) { return a.id < b.id; }));

}  // namespace

const char* qvAuxInfoName(unsigned id) {
    const Row* row = std::lower_bound(std::begin(rows), std::end(rows), id,
                                      [](const Row& a, unsigned value) { return a.id < value; });
    return row != std::end(rows) && row->id == id ? row->name : "?";
}

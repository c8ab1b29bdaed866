// Identifiers of the side information that goes through bufstream::auxinfo.
#pragma once

#include <cstdint>

#include "core/arch/api.h"

// Largest info that a queued item keeps, in bytes.
constexpr int MAX_AU_SIZE = 256;

namespace QvAuxId {

enum : unsigned {
    // Start codes of MPEG streams without their prefix, for picture and sequence events.
    ID_PICTURE_START_CODE = 0x100,
    ID_SLICE_MIN_START = 0x101,
    ID_USER_START_CODE = 0x1B2,
    ID_SEQ_START_CODE = 0x1B3,
    ID_EXT_START_CODE = 0x1B5,
    ID_SEQ_END_CODE = 0x1B7,
    ID_GOP_START_CODE = 0x1B8,
    ID_ISO_END_CODE = 0x1B9,
    ID_PACK_START_CODE = 0x1BA,
    ID_SYSTEM_START_CODE = 0x1BB,
    ID_PREFIX_START_CODE = 0x1FF,

    TS_MICROMV = 0xC0001,
    TS_DVB = 0xC0002,
    TS_DVHS = 0xC0004,

    BUF_SEEK_INFO = 0xC0011,  // BufSeekInfo: overwrite bytes of the output
    BUF_SEEK_SAMPLE_INFO = 0xC0012,
    BUF_SEEK_STREAM_INFO = 0xC0014,
    BUF_SEEK_UPDATE_SETTINGS = 0xC0015,
    BUF_SEEK_RESET = 0xC0016,
    BUF_SEEK_REMOVE_STREAM = 0xC0017,
    BUF_SEEK_INIT_OUTPUT = 0xC0018,
    BUF_SEEK_MSTART = 0xC0019,
    BUF_SEEK_REORDER = 0xC0020,  // BufReorderInfo: move a block of the finished file to its front

    UNSPECIFIED_AU = 0xF0000,
    VIDEO_AU_CODE =
        0xF0001,  // an access unit is complete; the first 32-bit word of info is its size in bytes
    AUDIO_AU_CODE = 0xF0002,  // likewise
    SP_AU_CODE = 0xF0004,
    VIDEO_AU_START = 0xF0008,
    BYTECOUNT_INFO = 0xF0010,  // out: 64-bit count of bytes of the output so far
    FLUSH_BUFFER = 0xF0020,
    SPLIT_OUTPUT = 0xF0040,
    STREAM_END_CODE = 0xF0080,
    VIDEO_STREAM_INFO = 0xF0100,
    VIDEO_AU_INFO = 0xF0200,
    AUDIO_STREAM_INFO = 0xF0400,
    AUDIO_AU_INFO = 0xF0800,

    TIME_STAMP_INFO = 0xF000000,
    STATISTIC_INFO = 0xF000001,
    CPB_FULLNESS = 0xF000002,
    TIMECODE_BREAK = 0xF000004,
    SAMPLE_INFO = 0xF001000,
    MUX_STATISTIC_INFO = 0xF001001,
    DD_STREAM_INFO = 0x1F000100,
    DMFA_STREAM_INFO = 0x2F000000,
    DMFV_STREAM_INFO = 0x2F000001,
    ACCESS_INFO = 0x30000000,
    STREAM_FORMAT_INFO = 0xF0000000,
    AUDIO_SYNC_CODE = 0xFFF00000,
};

// What only the records of files answer. These have no name in qvAuxInfoName.
enum : unsigned {
    NAV_HAS_HIGHLIGHT = 0xE0020,
    NAV_CELL_START = 0xE0080,
    NAV_AUDIO_LIST_ADD = 0xE0101,
    NAV_AUDIO_LIST_APPEND = 0xE0102,
    NAV_SUBPIC_LIST_ADD = 0xE0201,
    NAV_SUBPIC_LIST_APPEND = 0xE0202,
    NAV_LAST_POSITION = 0xE0203,
    NAV_COLLECT_BEGIN = 0xF1000,
    NAV_VOBU_INFO = 0xF2000,
    NAV_SEGMENT_END_TIME = 0xF4000,
    NAV_COLLECT_SKIP = 0xF8000,

    FILE_SPLIT_COUNT_INFO = 0xF00001,  // out: 32-bit count of splits
    FILE_NAME_INFO = 0xF00002,         // out: name of the file being written, NUL-terminated UTF-16
    FILE_SWAP_BYTES = 0xF00004,        // from now on each pair of bytes is read swapped
    FILE_SIZE_INFO = 0xF00008,         // out: 64-bit size of the file
    FILE_SEEK = 0xF00010,              // 64-bit position, origin in `offset`
    FILE_MODE_WRITE = 0xF00020,
    FILE_MODE_READ = 0xF00040,

    METADATA_OPEN_WRITE = 0x100001,  // `offset` is the slot, 0 to 7, in all of these
    METADATA_OPEN_READ = 0x100002,
    METADATA_CLOSE = 0x100003,
    METADATA_WRITE = 0x100004,
    METADATA_READ = 0x100005,
    METADATA_REWIND = 0x100006,
    METADATA_DELETE = 0x100007,
    METADATA_DELETE_AT_END = 0x100008,
    METADATA_LENGTH = 0x100009,  // out: 32-bit length of the slot's file
};

}  // namespace QvAuxId

#pragma pack(push, 4)
// Info of BUF_SEEK_INFO: `size` bytes at `data` replace those at `position` of the output. The receiver
// copies.
struct BufSeekInfo {
    int64_t position;
    const void* data;
    uint32_t size;
};
#pragma pack(pop)
static_assert(sizeof(BufSeekInfo) == 20);

// Info of BUF_SEEK_REORDER. The file holds head, body, block; what is wanted is head, block, body.
struct BufExtent {
    uint64_t position;  // in the file as it was written
    uint64_t size;
    uint64_t unused;
};
struct BufReorderInfo {
    BufExtent head;
    BufExtent block;
    BufExtent body;
};
static_assert(sizeof(BufReorderInfo) == 72);

// The identifier's name, as in "VIDEO_AU_CODE"; "?" for one that is not known.
QV_API const char* qvAuxInfoName(unsigned id);

// The picture buffer that moves between decoders, filters and encoders.
#pragma once

#include <cstddef>
#include <memory>

#include "core/arch/api.h"
#include "core/measure/fourcc.h"
#include "core/measure/qvframerate.h"
#include "core/value/anycontainer.h"

class QvFrame;
class QvUserData;
template <class T>
class TPtrList;

// The picture as it is given to encoder and decoder libraries: no padding between the members.
struct frame_tt {
    int width = 0;
    int height = 0;
    unsigned four_cc = 0;
    unsigned reserved = 0;
    unsigned char* planes[4] = {};
    int strides[4] = {};  // bytes from a row to the next
};
static_assert(sizeof(frame_tt) == 32 + 4 * sizeof(void*));

enum QvYUVMatrix : int { qvMatrixNotSet = 0, qvMatrixBT601 = 1, qvMatrixBT709 = 2 };

// One block of memory, cut into up to four planes that follow each other. A frame is empty until init, or a
// copy from another frame, gives it a format; operations on the planes of an empty frame are assertions.
//
//     plane 0  row 0  |<-- width * pixel bytes -->|  padding |
//              row 1  |<------------- stride(0) ----------->|
//     plane 1, plane 2: height(1) rows of stride(1) bytes (of I422 the copying operations know the upper
//                       half of the chroma rows only, and leave the rest)
//
// The block ends with spare bytes, so that vector kernels may read and write past the end of a row.
// Statuses are 0, QvStatus::failed with a log line, or QvStatus::outOfMemory; a copying operation that runs
// out of memory leaves the frame empty, with the metadata of its source. One thread at a time.
class QV_API QvFrame {
  public:
    static constexpr int spareBytes = 16384;

    int frameNr = -1;                       // of the picture in its stream, -1 when not known
    QvFramerate framerate{QvRatio(25, 1)};  // rate and scan flags of this picture

    QvFrame();
    QvFrame(const QvFrame& other);             // deep
    QvFrame& operator=(const QvFrame& other);  // deep; same size and FOURCC: into the planes that are there
    ~QvFrame();

    // Gives the frame a format and forgets everything it held. The pixels are not cleared; the bytes of its
    // own memory that belong to no pixel (the padding of rows, what odd sizes leave at the end of a plane,
    // the lower half of I422's chroma) are 0. `buffer`, if given, is used unchanged and stays the caller's:
    // it must hold total_bytes() and outlive the frame's use. `strides`: up to three integers, each of which
    // replaces the default of its plane if it is larger. 0, or -3 (frame empty) without memory, for a
    // negative size or above 2 GB. An unknown FOURCC is an assertion with a log line.
    int init(unsigned four_cc, int width, int height, unsigned char* buffer = nullptr,
             const AnyVector* strides = nullptr);
    void destroy();

    bool inited() const { return inited_; }
    bool external() const { return external_; }  // the memory belongs to a caller

    // --- Shape. Sizes of planes 1 to 3 are halved, rounded down, for every format.
    int width(int plane = 0) const { return plane ? tt_.width / 2 : tt_.width; }
    int height(int plane = 0) const { return plane ? tt_.height / 2 : tt_.height; }
    int planes() const { return planes_; }  // 0 when empty
    int plane_bytes(int plane) const;       // 0 for a plane that is not there
    int bytes(int plane) const;             // an assertion for a plane that is not there
    int total_bytes() const { return totalBytes_; }
    unsigned four_cc() const { return tt_.four_cc; }
    const char* str_four_cc() const;
    static int bitsPerPixel(unsigned four_cc);  // an assertion for an unknown FOURCC, R555 and R565
    static int bitDepth(unsigned four_cc);      // of a sample; an assertion for an unknown FOURCC
    int pixelBytes(int plane = 0) const;        // -1 for v210
    bool isRGB() const;                         // ARGB, BGR3, BGR4, BGRA
    bool is420() const;                         // I420, YV12
    bool is422() const;                         // YUYV, UYVY, YUY2, I422
    bool isPlanar() const { return planes_ > 1; }
    // Offsets of the samples in a pixel pair of YUY2, YUYV or UYVY; untouched for any other format.
    void get422offsets(int* y0, int* y1, int* u, int* v) const;

    // --- Pixels. With flip the start of the last row and the negated stride, to walk a plane bottom-up.
    // Null and 0 for a plane that the format does not have.
    unsigned char* plane(int plane = 0, bool flip = false);
    const unsigned char* plane(int plane = 0, bool flip = false) const;
    int stride(int plane = 0, bool flip = false) const;
    // Asserts that the pixel begins within the plane.
    unsigned char* pixelPtr(int x, int y, int plane = 0);
    const unsigned char* pixelPtr(int x, int y, int plane = 0) const;
    // The frame's own record: what is written through its planes is written into the frame.
    frame_tt* getFrame_tt() { return &tt_; }
    const frame_tt* getFrame_tt() const { return &tt_; }

    // --- Metadata: free for decoders and filters; these keys have operations of their own.
    AnyDict& meta() { return meta_; }
    const AnyDict& meta() const { return meta_; }
    long long getTimestamp() const;  // presentation time, -1 when not known
    void setTimestamp(long long timestamp);
    QvYUVMatrix YUVMatrix() const;
    void setYUVMatrix(QvYUVMatrix matrix);
    QvUserData* userData() const;  // borrowed, null when absent
    void setUserData(QvUserData* data);
    void clearUserData();
    AnyDict* subpic();  // of the text overlay; null when absent
    const AnyDict* subpic() const;
    void setSubpic(const AnyDict& subpic);
    void clearSubpic();

    // --- Whole pictures. The target takes format, rate, frameNr and metadata of the source. Rows are as long
    // as the smaller stride.
    int copy(const QvFrame& src, bool flip = false);        // flip: bottom-up, with the field order reversed
    void copyMeta(const QvFrame& src);                      // rate, frameNr and metadata only
    void copyMeta(const QvFrame& src, QvYUVMatrix matrix);  // and this matrix in the place of the source's
    // Pixels only. Strides of `tt` may be negative; with keepStrides they are wished for if the format
    // differs.
    int copyFramett(const frame_tt& tt, bool keepStrides);

    // --- Fields.
    int copyShifted(const QvFrame& src);   // up one row; the last row repeats the one two above it
    int changeDominance(bool up);          // the same in place, up or down
    int copySwitched(const QvFrame& src);  // the rows of each pair change places
    // Weaves two fields into a frame of twice their height, bottom field first.
    int interlace(const QvFrame& first, const QvFrame& second);
    // Even rows of the first, odd rows of the second; progressive.
    int combineFields(const QvFrame& first, const QvFrame& second);
    // Every second row from row 0 (firstField) or 1; progressive, half the height (even for I420 and YV12).
    int copyDeinterlaced(const QvFrame& src, bool firstField);
    // The averages of rows 2r and 2r + 1, rounded down; progressive, sized as by copyDeinterlaced.
    int copyBob(const QvFrame& src);

    // --- Parts of pictures.
    // Copies a rectangle between frames of one FOURCC. Coordinates are rounded to even as the chroma needs;
    // what does not lie in both frames is an assertion, and so is v210. Of I422 the luma is copied only. The
    // target takes the source's rate, with the field order that the rows now have.
    int clip(const QvFrame& src, int srcX, int srcY, int dstX, int dstY, int width, int height);
    // Draws src with its top left corner at x, y, which may be negative; what lies outside is left out, and
    // all coordinates are rounded to even. mask: GRAY of the source's size, 0 keeps the target, 255 takes the
    // source; null: the source covers. chromaMask: GRAY of half that size for the chroma of planar formats;
    // without it every second sample of the mask is used. I422 and v210 are assertions.
    // A row y at or beyond the target's width draws nothing, however tall the target is.
    int blend(int x, int y, const QvFrame& src, const QvFrame* mask = nullptr,
              const QvFrame* chromaMask = nullptr);
    // The same with one weight for all, 0.0 to 1.0; 1.0 is 255/256 of the source.
    int blend(int x, int y, const QvFrame& src, double alpha);

    void setBlack();
    // Fills BGR3, BGR4 and BGRA (whose fourth bytes stay); ARGB is filled with a pixel step of 3. Any other
    // format stays.
    void setRGB(unsigned char r, unsigned char g, unsigned char b);
    // Changes the label and moves no sample; -1 unless the formats are exchangeable.
    int changeFOURCC(unsigned four_cc);

    // --- Neighbours in a chain of views, borrowed, null at the ends.
    QvFrame* nextView() const { return next_; }
    QvFrame* prevView() const { return prev_; }

  private:
    friend QV_API void QvFrame_linkViews(const TPtrList<QvFrame>& views);
    struct Release {
        void operator()(unsigned char* memory) const;
    };

    bool inited_ = false;
    QvFrame* next_ = nullptr;
    QvFrame* prev_ = nullptr;
    int planeBytes_[4] = {};
    const QvPixelFormat* format_ = nullptr;
    std::array<char, 5> text_{};
    frame_tt tt_;
    int totalBytes_ = 0;
    int planes_ = 0;
    bool external_ = false;
    AnyDict meta_;
    std::unique_ptr<unsigned char[], Release> memory_;

    void _copyMeta(const QvFrame& src, const char* kept);  // null, or the key of an entry that is left alone
    void clearTails();
    std::ptrdiff_t pixelOffset(int x, int y, int plane) const;
};

// --- Views: a stereo or multi-view picture is a chain of frames, none of which owns another.

// Links the frames in the order of the list. The ends of the chain are null. An empty list is left alone.
QV_API void QvFrame_linkViews(const TPtrList<QvFrame>& views);
// Number of frames in a chain, counted from its head; any other frame is an assertion.
QV_API int QvFrame_nrViews(const QvFrame* frame);
// Position of a frame in its chain.
QV_API int QvFrame_viewIndex(const QvFrame* frame);

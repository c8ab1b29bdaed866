// The way of a picture from a stream to an output: its format at both ends and the filters between them.
#pragma once

#include <functional>
#include <optional>
#include <string>
#include <vector>

#include <qvplugcore/qvplugcore.h>

#include "tarsel/picture/effects.h"
#include "tarsel/source/source.h"

// How a film's numbers stand for colours: code points of ITU-T H.273, 0 where it does not say.
struct Colours {
    int primaries = 0, transfer = 0, space = 0;
    bool stated() const { return primaries > 0 || transfer > 0 || space > 0; }
};

struct PictureFormat {
    int width = 0, height = 0;
    unsigned fourcc = 0;
    QvFramerate rate{QvRatio(25, 1)};
    double aspect = 0;  // of the picture when it is shown
    Colours colours{};  // of what is read
    // Width to height of a pixel; 1 for anything near to it or beyond use.
    double pixelAspect() const;
};

// Of a video stream of a source.
PictureFormat pictureFormat(const Source& source, int stream);

class PictureEffects {
  public:
    // `in`: what the options work on. `toPng`: the output is shown as RGB. The options have to outlive it.
    // Throws Failure for options that don't fit the picture.
    PictureEffects(const EffectOptions& options, const PictureFormat& in, bool toPng);

    const PictureFormat& in() const { return in_; }
    const PictureFormat& out() const { return out_; }

    // The filters of a run that writes `frames` frames. `alone`: frames are asked for singly, so that none
    // is the first. Throws Failure for what can't be used.
    FiltersState filters(long long frames, bool alone) const;
    // The run itself.
    VideoJobDescription job(const FiltersState& filters) const;
    // Whether a frame depends on those before it.
    bool needsAllFrames() const;

  private:
    void planDeinterlace();
    void planRate();
    void planCrop();
    void planSize();
    void planFit();
    void planMatrix(bool toPng);
    void planTimecode();
    void addFixed(FiltersState& state) const;
    void addOptions(FiltersState& state, long long frames, bool alone) const;

    const EffectOptions& options_;
    PictureFormat in_, out_;
    std::string deinterlace_;  // method, empty for none
    std::optional<QvRect> crop_;
    int barColumns_ = 0, barRows_ = 0;  // on each side of what is kept
    int inMatrix_ = 0, outMatrix_ = 0;
};

// The type (1 video, 2 audio) of the streams that a filter of --filter works on. Throws Failure.
int filterType(const std::string& spec);
// The stored state of the filter that --filter describes, switched on.
AnyDict filterState(const std::string& spec);

// The first file that a filter has been given to read (QV_GUI_FILESELECT_LOAD) or to write (..._SAVE), as its
// descriptions of parameters say; empty without one.
std::string filterFile(const QvCodec& filter, int guiControl);

// Puts another name in the place of each file that filters read or write.
using OtherFile = std::function<std::string(const std::string& file, const char* filter, bool writes)>;
void changeFilterFiles(FiltersState& filters, const OtherFile& other);
// Calls `visit` for each file that a filter which is on reads or writes.
using FilterFileVisit = std::function<void(const QvCodec& filter, const std::string& file, bool writes)>;
void visitFilterFiles(const FiltersState& filters, const FilterFileVisit& visit);

// The files that the filters of a pipe have been given.
struct FilterFiles {
    struct Written {
        std::string file, filter;
    };
    std::vector<std::string> read;
    std::vector<Written> written;
};
FilterFiles filterFiles(const QvVProcessPipe& pipe);

// The pipe of a job, null if it has nothing to do. Each filter has been tried, so that what fails later fails
// by chance. Throws Failure.
std::unique_ptr<QvVProcessPipe> tryPipe(const VideoJobDescription& job);
// A line for each filter of a pipe: its name and its parameters.
std::vector<std::string> describe(const QvVProcessPipe* pipe);
std::vector<std::string> describe(const FiltersState& filters);  // those that are on

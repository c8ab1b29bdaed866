// Segments one after the other: which one plays, what each stream gets of it, and when the next one begins.
// Internal to this folder.
#pragma once

#include <cstddef>
#include <memory>
#include <string>
#include <vector>

#include "core/job/jobdescription.h"
#include "core/media/qvbuffer.h"
#include "core/transcode/batch/framewindow_p.h"
#include "core/transcode/batch/segmentaudio_p.h"
#include "core/transcode/batch/segmentvideo_p.h"

// Lists that are indexed by the numbers of streams and segments.
namespace qvlist {

template <class T>
bool inRange(int index, const std::vector<T>& list) {
    return index >= 0 && static_cast<std::size_t>(index) < list.size();
}

template <class T>
auto& at(T& list, int index) {
    return list[static_cast<std::size_t>(index)];
}

template <class T>
int sizeOf(const std::vector<T>& list) {
    return static_cast<int>(list.size());
}

}  // namespace qvlist

struct BatchSegment {
    std::vector<std::unique_ptr<SegmentVideo>> videos;  // in the order of the output's
    std::vector<std::unique_ptr<SegmentAudio>> audios;
    MediaTime length;  // set by prepare: of its shortest video stream, or without one of its shortest sound

    const QvIStream* input(int type, int stream) const;  // null for a stream that it does not have
};

// Order of use: the caller fills in jobs and segments, then calls prepare, makeOutputs, restart for each
// stream, reads, stop. A failure is a status with a reason in `why`.
class JoinedSegments {
  public:
    std::vector<BatchSegment> segments;
    std::vector<VideoJobDescription> videoJobs;
    std::vector<AudioJobDescription> audioJobs;
    AnyVector smartStreams;  // numbers of the video streams that are not read

    bool isSmart(int video) const { return smartStreams.contains(Any(video)); }
    // What an encoder needs to copy coded frames of (type, stream); false unless every segment can give them
    // unconverted.
    AnyVector storedFiles() const;
    AnyVector storedSources(const Pair& address) const;
    bool smartParams(const Pair& address, AnyDict& out) const;
    int frameTotal(int stream) const;            // at any time
    long long clippedSamples(int stream) const;  // beyond full scale, of those that were read
    long long sampleTotal(int stream) const;     // of the sources' sound
    // How many samples the reads give: if there is a picture, the sound is as long as the picture.
    long long soundTotal(int stream) const;

    // Builds each conversion once, so that an impossible one fails here. It is built again for its segment.
    int prepare();
    void makeOutputs();
    // From the first segment on.
    int restart(int stream, bool video);
    // QvStatus::endOfStream after the last segment.
    int readFrame(int stream);
    int readSamples(int n, int stream);
    int stop();

    std::string why;
    int current = 0;               // segment
    std::vector<int> totalFrames;  // one a stream, as the next three from makeOutputs to stop
    std::vector<long long> totalSamples;
    std::vector<FrameWindow> frames;
    struct SoundOutput {
        QvPcm buffer;
        int segment = 0;  // that it reads
    };
    std::vector<SoundOutput> sounds;

  private:
    bool videoLeads() const;
    int startVideo(int segment, int stream);
    int startAudio(int segment, int stream);
    int startSegment();
    int stopSegment(int segment);
    void logCounts(int segment) const;
    void logStart() const;
    int nextSegment();
    int nextSound(int stream);
    long long owed(const BatchSegment& segment, int stream) const;
    int fill(SegmentAudio& audio, int n, QvPcm& buffer, int segment);
    int readLedSound(int n, int stream);
    int readLeadingSound(int n, int stream);
};

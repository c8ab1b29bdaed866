// The stored description of a transcode: a dictionary with typed access. It has no other data, so it is
// stored and read like any value, and changes of a key take effect at once.
//
//     QvTaskState state(stored);
//     for (int i = 0; i < state.nrSegments(); ++i) state.setSegmentEnabled(i, wanted(i));
//     QvTask* task = QvBatchTask::fromState(state, decoders, &pipe, 0);
//
// Keys: "__version__", "__class__", "encoder" (a QvEncodePipeState), "filename" (of the output), "files" (a
// Vector of File), "streams" (a Vector with a Dict for each output stream: "type", and "sources", a Vector
// with a Source for each segment), "postProcess", "enabled", "segments" (a Vector of 1 and 0), "presetName".
// "#nsegs" is the number of segments as last counted, -1 when the streams differ: code that changes "streams"
// by hand removes it. "segments" appears when a segment is first enabled, disabled, added, removed or moved.
//
// A *segment* is one Source for each output stream; several are played one after the other. What is absent,
// or of another type, reads as an empty value. Wrong indexes and counts are a line in the log and an
// assertion (QvAssertFailure): a state from a file of any origin is checked by QvTaskFile first.
#pragma once

#include <array>
#include <memory>
#include <vector>

#include "core/arch/api.h"
#include "core/job/processparams.h"
#include "core/transcode/task/qvencodepipestate.h"
#include "core/value/any.h"
#include "core/value/anycontainer.h"
#include "core/value/ptrlist.h"

class QV_API QvTaskState : public AnyDict {
  public:
    // Where one output stream gets one segment from.
    class QV_API Source : public AnyDict {
      public:
        Source() = default;
        Source(const AnyDict& dict) : AnyDict(dict) {}

        Any filename() const { return get("file"); }
        int type() const;    // QvStreamType; 0 when absent
        int number() const;  // of the stream within its type
        ProcessParams processParams() const;
        AnyDict info() const;
    };

    // An input file.
    class QV_API File : public AnyDict {
      public:
        File() = default;
        File(const AnyDict& dict) : AnyDict(dict) {}

        Any filename() const { return get("filename"); }
        AnyDict decoder() const;
    };

    // A snapshot of the sources of a segment, in the order of the output streams; an output stream without a
    // source has an empty one. Copies share the sources.
    class QV_API Segment : public TRefList<const Source> {
      public:
        Segment() = default;
        explicit Segment(std::vector<Source> sources);

      private:
        std::shared_ptr<const std::vector<Source>> sources_;
    };

    QvTaskState() = default;
    // The segments of a dictionary from elsewhere are counted anew.
    QvTaskState(const AnyDict& dict) : AnyDict(dict) { remove("#nsegs"); }

    // --- The task as a whole --------------------------------------------------------------------

    QvEncodePipeState encoder() const;
    const Any& outputFilename() const { return get("filename"); }
    void setOutputFilename(const Any& name) { set("filename", name); }
    const Any& postprocessCommand() const { return get("postProcess"); }
    void setPostprocessCommand(const Any& command) { set("postProcess", command); }
    bool isEnabled() const;  // true when absent
    void setEnabled(bool on);
    // References are valid until the state changes. What is absent is a reference to the null sentinel.
    const AnyVector& inputFiles() const { return getVector("files"); }
    AnyVector inputFilenames() const;

    // --- Streams --------------------------------------------------------------------------------

    // What feeds the output streams, and the encode pipe's own.
    const AnyVector& streams_in() const { return getVector("streams"); }
    const AnyVector& streams_out() const { return getDict("encoder").getVector("streams"); }
    const AnyDict& stream_in(int index) const;            // empty out of range
    const AnyDict& stream_in(const Pair& address) const;  // (type, number)
    int nrStreams(int type) const;                        // of the encode pipe; a mask, 0 and 255 mean all
    int nrStreams(std::array<int, 3>& count) const;       // also video, audio, subpicture
    int nrValidStreams(std::array<int, 3>& count) const;  // only those with a source
    int nrSources(int stream) const;
    Source source(int stream, int segment) const;  // empty out of range, as the next three
    Source source(const Pair& address, int segment) const;
    const AnyVector& sources(int stream) const;
    const AnyVector& sources(const Pair& address) const;
    ProcessParams processParams(int stream, int segment) const;
    ProcessParams processParams(const Pair& address, int segment) const;
    // Index in inputFiles(), or -1. Asserts an input file without a name.
    int fileByFilename(const Any& name) const;
    int fileForSource(const Source& source) const;
    // (type, number) of the streams of that file which the first segment uses, in the order of the output's.
    AnyVector streamsForFile(const Any& name) const;
    // Drops the output streams that nothing feeds.
    void removeSlots();

    // --- Changing the output --------------------------------------------------------------------

    // As many streams as before (assertion). Text as `filename` replaces the output's name.
    void updateOutput(const AnyDict& encoder, const Any& filename);
    // Output and preset name of `other`; with a segment index its first segment replaces that one.
    void update(const QvTaskState& other, int segment = -1);

    // --- Segments -------------------------------------------------------------------------------

    // 0 if the streams have different numbers of segments; streams without sources are not looked at. The
    // non-const operation stores the result as "#nsegs".
    int nrSegments();
    int nrSegments() const;
    AnyVector segments() const;  // 1 or 0 for each
    bool isSegmentEnabled(int index) const;
    void setSegmentEnabled(int index, bool on);  // asserts an index out of range
    // The sources of a segment; -13 (QvStatus::invalidStructure) beyond the count. `fileIndices`, if given,
    // takes for each source its place in inputFiles(), or -1.
    int getSegment(int index, Segment* segment, std::vector<int>* fileIndices = nullptr) const;
    // The input files that the segment uses, each once, in the order of its sources. As getSegment.
    int getFilesForSegment(int index, AnyVector& files) const;
    // Adds a segment in front of `position`; -1 appends. `sources` has one for each stream, of its type.
    // `files` (Dicts that are a File) whose names are new are added to the input files. 0, or an assertion
    // that changes nothing, also for a state without sources and without "segments".
    int addSegment(const AnyVector& sources, const AnyVector& files, int position = -1);
    // Replaces a segment. With another file or stream number `files` must not be empty.
    int updateSegment(const AnyVector& sources, const AnyVector& files, int position);
    // The input files are unchanged, also those that nothing uses any more.
    int removeSegment(int index);
    int swapSegments(int a, int b);  // -1 without streams

  private:
    int countSegments() const;
    int _checkSegmentCounts();
    void _initEnabledState();
    AnyVector newFiles(const AnyVector& files) const;  // those whose name the state does not have
};

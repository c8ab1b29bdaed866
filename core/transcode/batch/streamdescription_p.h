// What a joined stream says about itself, from the format that it is converted to. Internal to this folder.
#pragma once

class AnyDict;
struct AudioJobDescription;
struct VideoJobDescription;

// The keys of a stream as a decoder answers them, see "core/decode/qvdecoder.h".
void qvDescribeVideo(const VideoJobDescription& job, int frames, AnyDict& params);
void qvDescribeAudio(const AudioJobDescription& job, long long samples, AnyDict& params);

// What an open decoder answers, for the time when it is closed.
#pragma once

#include <map>
#include <string>
#include <vector>

#include "core/measure/mediatime.h"
#include "core/measure/streamtype.h"
#include "core/value/any.h"
#include "core/value/anycontainer.h"

class QvDecodePipe;

struct SourceFacts {
    struct Stream {
        AnyDict params;
        long long units = 0;  // frames of video, samples of audio, 0 for subpictures
        MediaTime duration;   // 0 for subpictures
        bool selected = false;
        bool readsUserData = false;
    };

    explicit SourceFacts(QvDecodePipe& decoder);  // which is open

    // The streams of one type; none for what is no type.
    const std::vector<Stream>& of(int type) const;
    // Null when there is none.
    const Stream* stream(int type, int number) const;

    std::string name;  // of the module
    Any filename;
    AnyDict stored;
    // Other parameters by name; they come in as they are asked for.
    mutable std::map<std::string, Any> answers;

  private:
    std::vector<Stream> streams_[3];
};

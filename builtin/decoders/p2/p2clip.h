// The clips of P2 cards, as folders and documents describe them:
//
//     CARD/CONTENTS/CLIP/0001AB.XML       what the clip is, and the clips before and after it in one take
//                   VIDEO/0001AB.MXF      its picture
//                   AUDIO/0001AB00.MXF    its sounds, one channel each, 00 to 15
//
// A take that is longer than a card is a chain of clips on several cards, whose folders lie next to each
// other, or on one folder that they were copied to. Names are found in any case of letters.
#pragma once

#include <string>
#include <vector>

#include "core/value/any.h"

// `count` times `num` / `den` seconds; a count of 0 where it is not known.
struct P2Length {
    long long count = 0;
    int num = 1;
    int den = 1;
};

struct P2Clip {
    static constexpr int maxSounds = 16;

    Any document;
    std::string name;           // of its files
    std::string id;             // in the whole world; may be empty
    std::string userName;       // given by its user; may be empty
    std::string startTimecode;  // "HH:MM:SS:FF", or with ";"; empty if there is none
    std::string previousId;     // of the clip before it in the take; empty at its start
    std::string nextId;
    P2Length length;
    bool hasPicture = false;
    int nrSounds = 0;
    // Files, once they are found.
    Any picture;
    std::vector<Any> sounds;
};

// Why something is not as asked. `foreign`: it is a document of another kind, or none.
struct P2Fault {
    std::string text;
    bool foreign = false;
    bool empty() const { return text.empty(); }
};

// The document that a name means: itself, or the one clip (or take) of a card folder, its CONTENTS or CLIP.
P2Fault p2FindDocument(const Any& name, Any& document);

// The clips of the take of which a document is a part, with their files, in order; with `join` false that one
// alone. A part that can't be found is a fault.
P2Fault p2ReadTake(const Any& document, bool join, std::vector<P2Clip>& parts);

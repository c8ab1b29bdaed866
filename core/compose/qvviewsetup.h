// The set-up of a picture of several views (stereo, several cameras): which streams are its views, and how
// they are shown. It is stored in a metafile as
//
//     <Metafile>
//       <MVInterleave layout="side-by-side">
//         <view file="left.avi" stream="0" />
//         <view file="right.yuv">
//           <dict name="rawdec"> ... </dict>           what QvDecodePipe::store wrote of its decoder
//         </view>
//       </MVInterleave>
//     </Metafile>
//
// `layout` may be absent ("interleaved"), and so may `stream` (0). Names that are not absolute count from the
// folder of the metafile on.
#pragma once

#include <string>
#include <string_view>
#include <vector>

#include "core/arch/api.h"
#include "core/value/any.h"
#include "core/value/anycontainer.h"

// How views become pictures. With three views A, B, C:
enum class QvViewLayout {
    interleaved,  // "interleaved"   a frame has the views A, B, C
    swapped,      // "swapped"       the views C, B, A
    sideBySide,   // "side-by-side"  one picture A B C, three times as wide
    topBottom,    // "top-bottom"    A over B over C, three times as high
    lineByLine,   // "line-by-line"  rows A0 B0 C0 A1 B1 C1 ..., three times as high
    left,         // "left"          A alone
    right,        // "right"         C alone
};

class QV_API QvViewSetup {
  public:
    static constexpr int maxViews = 16;  // inputs

    struct View {
        Any file{};       // text; empty for a decoder that needs none
        int stream = 0;   // of its video streams
        AnyDict state{};  // of the decoder, as QvDecodePipe::store made it; empty: the one of the extension
    };

    QvViewLayout layout = QvViewLayout::interleaved;
    std::vector<View> views;

    static const char* layoutName(QvViewLayout layout);
    static bool findLayout(std::string_view name, QvViewLayout& layout);  // false if there is none
    static std::vector<std::string> layoutNames();

    // "layout", a String, and "views", a Vector of Dicts "file", "stream", "state".
    void store(AnyDict& dict) const;
    // Why the dictionary is no set-up, which then is unchanged; empty if it is one.
    std::string restore(const AnyDict& dict);
    // As a metafile: QvMetafile::save, which throws.
    int save(const Any& path) const;
    // From a metafile. Why it can't be read, or holds no views (isNone says which); empty if it was.
    std::string load(const Any& path, bool* isNone = nullptr);

    // Makes the element known to QvMetafile. The engine does so at its start.
    static void registerElement();
};

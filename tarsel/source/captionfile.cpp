#include "tarsel/source/captionfile.h"

#include <string_view>

#include "tarsel/host/files.h"
#include "tarsel/words/messages.h"

void refuseScc(const std::string& name) {
    constexpr std::string_view kTitle = "Scenarist_SCC V1.0";
    constexpr std::string_view kMark = "\xEF\xBB\xBF";  // of UTF-8
    const std::string head = firstBytes(name, kMark.size() + kTitle.size());
    std::string_view text = head;
    if (text.substr(0, kMark.size()) == kMark) text.remove_prefix(kMark.size());
    throw failure(text.substr(0, kTitle.size()) == kTitle ? Msg::inputNoCaptions : Msg::inputNoScc, {name});
}

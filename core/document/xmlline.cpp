#include "core/document/xmlline_p.h"

#include <cstdio>
#include <memory>
#include <string>

#include <expat.h>

#include "core/arch/platform.h"
#include "core/value/any.h"

namespace {

constexpr int blockSize = 64000;

// Follows the open elements down the way that is asked for.
struct Search {
    XML_Parser parser;
    std::span<const int> children;
    std::size_t reached = 0;  // levels of the way, the root included, that are open
    std::size_t depth = 0;    // open elements
    int next = 0;             // number of the next child of the last element that was reached
    int line = 0;

    void start() {
        const bool onWay = depth == reached && (depth == 0 || next++ == children[depth - 1]);
        ++depth;
        if (!onWay) return;
        reached = depth;
        next = 0;
        if (reached <= children.size()) return;
        line = static_cast<int>(XML_GetCurrentLineNumber(parser));
        XML_StopParser(parser, XML_FALSE);
    }
    // Nothing more is to be found once an element of the way has ended.
    void end() {
        if (depth-- == reached) XML_StopParser(parser, XML_FALSE);
    }
};

void onStart(void* search, const char*, const char**) { static_cast<Search*>(search)->start(); }
void onEnd(void* search, const char*) { static_cast<Search*>(search)->end(); }

}  // namespace

int qvXmlLine(const Any& file, std::span<const int> children) {
    const Any name = file.toString();
    const std::unique_ptr<std::FILE, int (*)(std::FILE*)> input(
        qv_platform().openFile(name.asString(""), "rb"), &std::fclose);
    const std::unique_ptr<XML_ParserStruct, void (*)(XML_Parser)> parser(XML_ParserCreate(nullptr),
                                                                         &XML_ParserFree);
    if (!input || !parser) return 0;
    Search search{parser.get(), children};
    XML_SetUserData(parser.get(), &search);
    XML_SetElementHandler(parser.get(), onStart, onEnd);
    for (bool last = false; !last;) {
        void* const block = XML_GetBuffer(parser.get(), blockSize);
        if (!block) return 0;
        const std::size_t got = std::fread(block, 1, blockSize, input.get());
        last = got < blockSize;
        if (XML_ParseBuffer(parser.get(), static_cast<int>(got), last) != XML_STATUS_OK) break;
    }
    return search.line;
}

#include <cstdio>
#include <exception>
#include <memory>
#include <new>

#include <expat.h>

#include "core/arch/qvassert.h"
#include "core/arch/qvexception.h"
#include "core/document/generictext_p.h"
#include "core/document/xmldictionary_p.h"
#include "core/document/xmldom.h"
#include "core/document/xmltext_p.h"
#include "core/document/xmlwriter_p.h"
#include "core/engine/files/qvfileutil.h"
#include "core/engine/log/qvlog.h"
#include "core/engine/threads/qvtimer.h"

namespace {

constexpr int blockSize = 64000;

struct FreeParser {
    void operator()(XML_Parser parser) const { XML_ParserFree(parser); }
};

}  // namespace

struct XmlParser::Watch {
    std::unique_ptr<XML_ParserStruct, FreeParser> expat{XML_ParserCreate(nullptr)};
    const char* refusal = nullptr;  // why the document is refused, if expat itself has nothing against it
    std::exception_ptr failure;     // what a handler threw; it must not pass through expat
    long long bytes = 0;
    long long nodes = 0;
    long long defaultBytes = 0;
    long long expanded = 0;

    void stop() { XML_StopParser(expat.get(), XML_FALSE); }
    void refuse(const char* reason) {
        if (!refusal) refusal = reason;
        stop();
    }
    bool stopped() const { return refusal || failure; }

    // Counts an element with its attributes. Those after the specified ones come from declared defaults.
    void countElement(const char** attrs) {
        const int specified = XML_GetSpecifiedAttributeCount(expat.get());
        int count = 0;
        for (; attrs[count]; count += 2)
            if (count >= specified)
                defaultBytes += static_cast<long long>(std::string_view(attrs[count + 1]).size());
        nodes += 1 + count / 2;
        if (nodes > maxNodes) refuse("too many elements");
        if (defaultBytes > maxToken) refuse("attribute defaults too large");
    }

    void countGeneric(const XmlNode& node) {
        if (node.getAttr("type") != "gen" && (!node.name() || std::string_view(node.name()) != "gen")) return;
        expanded += qvGenericLength({node.data(), static_cast<std::size_t>(node.dataSize())});
        if (expanded > maxExpanded) refuse("binary data too large");
    }

    static void onEntityDeclared(void* self, const char*, int, const char*, int, const char*, const char*,
                                 const char*, const char*) {
        static_cast<XmlParser*>(self)->_watch->refuse("entity declarations are not allowed");
    }
    static void onEntitySkipped(void* self, const char*, int) {
        static_cast<XmlParser*>(self)->_watch->refuse("undefined entity");
    }

    template <class Action>
    void guarded(Action action) {
        if (stopped()) return;
        try {
            action();
        } catch (...) {
            failure = std::current_exception();
            stop();
        }
    }
};

XmlParser::~XmlParser() { _cleanup(); }

void XmlParser::_cleanup() {
    for (const XmlNode* const node : _parseStack) delete node;
    _parseStack.clear();
    delete _root;
    _root = nullptr;
}

void XmlParser::startElementHandler(const char* name, const char** attrs) {
    _watch->countElement(attrs);
    if (_parseStack.size() >= maxDepth) _watch->refuse("elements nested too deep");
    if (_watch->stopped()) return;
    auto node = std::make_unique<XmlNode>(name, attrs);
    _parseStack.append(node.get());
    node.release();
}

void XmlParser::endElementHandler(const char*) {
    QV_ASSERT_MSG(!_parseStack.empty(), "!_parseStack.empty()");
    std::unique_ptr<XmlNode> node(_parseStack.remove(_parseStack.size() - 1));
    _watch->countGeneric(*node);
    if (!_parseStack.empty()) {
        _parseStack.back()->addChild(node.get());
    } else {
        QV_ASSERT_MSG(!_root, "!_root");
        _root = node.get();
    }
    node.release();
}

void XmlParser::dataHandler(const char* text, int size) {
    if (!_parseStack.empty()) _parseStack.back()->addRawData(text, size);
}

void XmlParser::s_startElementHandler(void* self, const char* name, const char** attrs) {
    auto* const parser = static_cast<XmlParser*>(self);
    parser->_watch->guarded([&] { parser->startElementHandler(name, attrs); });
}

void XmlParser::s_endElementHandler(void* self, const char* name) {
    auto* const parser = static_cast<XmlParser*>(self);
    parser->_watch->guarded([&] { parser->endElementHandler(name); });
}

void XmlParser::s_dataHandler(void* self, const char* text, int size) {
    auto* const parser = static_cast<XmlParser*>(self);
    parser->_watch->guarded([&] { parser->dataHandler(text, size); });
}

// Feeds the file block by block, a short one being the last. What expat has not consumed of a token is
// scanned again with the next block, so the length of a token is limited for time as well as for memory.
void XmlParser::parseStream(void* stream, const Any& path) {
    auto* const file = static_cast<std::FILE*>(stream);
    const XML_Parser expat = _watch->expat.get();
    bool last = false;
    while (!last && !_watch->stopped()) {
        void* const block = XML_GetBuffer(expat, blockSize);
        if (!block) throw std::bad_alloc();
        const auto size = std::fread(block, 1, blockSize, file);
        last = size < blockSize;
        _watch->bytes += static_cast<long long>(size);
        if (std::ferror(file)) _watch->refuse("read error");
        if (_watch->bytes > maxBytes) _watch->refuse("document too large");
        if (_watch->stopped()) break;
        if (XML_ParseBuffer(expat, static_cast<int>(size), last) == XML_STATUS_ERROR) break;
        if (_watch->bytes - XML_GetCurrentByteIndex(expat) > maxToken && !last)
            _watch->refuse("element or declaration too long");
    }
    if (_watch->failure) std::rethrow_exception(_watch->failure);
    const XML_Error error = XML_GetErrorCode(expat);
    if (!_watch->refusal && error == XML_ERROR_NONE) return;
    const char* const reason = _watch->refusal ? _watch->refusal : XML_ErrorString(error);
    const Any name = path.toString();
    throw QvFileException(Any::sprintf("Error in xml file %s %s at line %d", name.asString(""), reason,
                                       static_cast<int>(XML_GetCurrentLineNumber(expat)))
                              .asString());
}

int XmlParser::parseFile(const Any& path) {
    _cleanup();
    const std::unique_ptr<std::FILE, int (*)(std::FILE*)> file(
        static_cast<std::FILE*>(qvfopen(path, "rb")), [](std::FILE* open) { return std::fclose(open); });
    if (!file)
        throw QvFileException(Any::sprintf("Can not open file %s", path.toString().asString("")).asString());

    Watch watch;
    if (!watch.expat) throw std::bad_alloc();
    const XML_Parser expat = watch.expat.get();
    XML_SetUserData(expat, this);
    XML_SetElementHandler(expat, s_startElementHandler, s_endElementHandler);
    XML_SetCharacterDataHandler(expat, s_dataHandler);
    XML_SetEntityDeclHandler(expat, Watch::onEntityDeclared);
    XML_SetSkippedEntityHandler(expat, Watch::onEntitySkipped);
    _watch = &watch;
    try {
        parseStream(file.get(), path);
    } catch (...) {
        _watch = nullptr;
        _cleanup();
        throw;
    }
    _watch = nullptr;
    _bytes = watch.bytes;
    return 0;
}

int XmlParser::storeXmlTree(const Any& path, XmlNode* root, const char* doctype) {
    QV_ASSERT(root);
    qvStoreXml(path, *root, doctype);
    return 0;
}

int XmlParser::storeDict(const Any& path, const AnyDict& dict, const char* className, const Any& version) {
    return qvStoreXmlDict(path, dict, className, version);
}

int XmlParser::restoreDict(const Any& path, AnyDict& dict, Any& rootName, Any& version) {
    version = -1;
    dict.clear();
    XmlParser parser;
    QvTimer timer;
    int result = -1;
    try {
        result = parser.parseFile(path);
    } catch (const QvFileException& failure) {
        qv_dbg()->error("%s", failure.what());
    }
    qv_dbg()->debug("XmlParser.restoreDict: parseFile %f", timer.stop());
    XmlNode* const root = parser.topLevel();
    if (!root) return result;
    if (qvHoldsTooManyObjects(*root, parser._bytes)) {
        qv_dbg()->error("XmlParser.restoreDict: %s holds too many dictionaries",
                        path.toString().asString(""));
        return -1;
    }
    rootName = root->name();
    if (root->getAttr("version").isString()) version = root->getAttr("version");
    if (root->nrChildren() == 0) {
        qv_dbg()->error("XmlParser.restoreDict: %s holds no entries", path.toString().asString(""));
        return -1;
    }

    timer.start();
    qvDictOfXml(*root, dict);
    qv_dbg()->debug("XmlParser.restoreDict: toAny %f", timer.stop());
    return 0;
}

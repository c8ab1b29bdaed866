// XML documents: the tree in memory, the parser that builds it and the file round trip of dictionaries.
//
//     XmlParser parser;
//     parser.parseFile("list.xml");                        // throws QvFileException
//     for (int i = 0; i < parser.topLevel()->nrChildren(); ++i) ...
//
//     XmlParser::storeDict("a.xml", dict, "BatchList", "2.1");
//     if (XmlParser::restoreDict("a.xml", dict, rootName, version) != 0) ...
//
// Texts of a document are Strings where they are ASCII, else WStrings; names are always Strings, in UTF-8.
#pragma once

#include <cstddef>
#include <string>

#include "core/arch/api.h"
#include "core/value/any.h"
#include "core/value/anycontainer.h"
#include "core/value/ptrlist.h"

// An element with its attributes, character data and children. It owns its children.
class QV_API XmlNode {
  public:
    // `attrs` alternates names and values and ends with a null; it may be null itself. A `parent` takes this
    // node as its last child and owns it from then on. All may be null.
    explicit XmlNode(const char* name, const char** attrs = nullptr, XmlNode* parent = nullptr,
                     const char* data = nullptr);
    XmlNode(const XmlNode&) = delete;
    XmlNode& operator=(const XmlNode&) = delete;
    virtual ~XmlNode();

    // Nodes come and go in great numbers: they are cut from large blocks.
    static void* operator new(std::size_t size);
    static void operator delete(void* node);

    const char* name() const { return named_ ? name_.c_str() : nullptr; }  // null for a node without a name
    void setName(const char* name);                                        // null takes the name away
    // "ns:item" becomes "item"; a name with no or more than one colon stays.
    void stripXMLNamespace(bool recursive);

    AnyDict& attrs() { return attributes_; }
    const AnyDict& attrs() const { return attributes_; }
    const Any& getAttr(const char* name) const { return attributes_.get(name); }  // invalid if absent
    void setAttr(const char* name, const Any& value) { attributes_.set(name, value); }

    // The character data, with the whitespace between child elements. NUL-terminated, never null, valid until
    // the data changes.
    const char* data() const { return data_.c_str(); }
    int dataSize() const { return static_cast<int>(data_.size()); }
    Any rawData() const;                               // "" if there is none
    void addRawData(const char* text, int size = -1);  // -1: up to the NUL
    // Replaces the data. At most capacity - 1 characters are kept: 511 for a node whose data never grew.
    // Numbers ignore the locale.
    void sprintf(const char* format, ...) QV_PRINTF(2, 3);

    int nrChildren() const { return children_.size(); }
    XmlNode* child(int index) const { return children_.at(index); }  // an assertion outside the range
    XmlNode* child(const char* name) const;                          // the first of this name, or null
    void addChild(XmlNode* child);                                   // takes ownership
    void deleteChildren();                                           // takes no memory

    // Writes the element to a std::FILE*, two blanks an indent. -1 if the node has no name or the stream
    // refuses a part, else 0; children without a name are left out. What a document can't hold (control
    // characters, bytes that are not UTF-8) is written as U+FFFD. Whether the stream took it all is to be
    // asked of the stream.
    int write(void* stream, int indent) const;

  private:
    static void deleteTree(XmlNode* node);

    std::string data_;
    int capacity_ = 512;  // the bound of sprintf; memory is taken as needed
    bool named_ = false;
    AnyDict attributes_;
    std::string name_;
    TPtrList<XmlNode> children_;
};

// The nodes that are open during a parse.
class QV_API XmlNodeStack : public TPtrList<XmlNode> {
  public:
    ~XmlNodeStack() override = default;
};

class QV_API XmlParser {
  public:
    // What a document may be at most; one beyond any of these is refused as damaged.
    static constexpr int maxDepth = 1000;               // elements inside one another
    static constexpr long long maxBytes = 256LL << 20;  // the file
    static constexpr int maxNodes = 8'000'000;          // elements and attributes
    static constexpr long long maxToken = 8LL << 20;  // one tag, comment or declaration; also the sum of all
                                                      // values that attributes take from declared defaults
    static constexpr long long maxExpanded = 64LL << 20;  // the bytes that all `gen` elements describe
    // restoreDict alone: the dictionaries under a class name, each of which takes several hundred bytes of
    // memory. A document may hold more of them if it has at least bytesPerObject bytes for each.
    // Within these limits a tree and its dictionary together take at most 60 bytes of memory for a byte of a
    // document of a megabyte or more, also while it is read; those of a smaller one at most 60 MiB.
    static constexpr int maxObjects = 20'000;
    static constexpr int bytesPerObject = 16;

    XmlParser() = default;
    XmlParser(const XmlParser&) = delete;
    XmlParser& operator=(const XmlParser&) = delete;
    virtual ~XmlParser();

    // Replaces the tree by that of a file. The result is 0. Throws QvFileException:
    //     "Can not open file NAME"
    //     "Error in xml file NAME REASON at line N"
    // and holds no tree then. A document type may be declared; documents that declare entities, or use any
    // but the five of XML, are refused. Nothing but the file itself is ever opened.
    int parseFile(const Any& path);
    XmlNode* topLevel() { return _root; }  // owned by the parser until the next parse; null without a tree

    // Writes a document. "stdout" and "stderr" are those streams. `doctype` may be null. The result is 0.
    // Throws QvFileException, before the file is touched for a tree that could not be read again (a name that
    // is no XML name, too deep):
    //     "Can not store '...': REASON"
    //     "Can not open '...' for writing"
    //     "Can not write '...'"
    static int storeXmlTree(const Any& path, XmlNode* root, const char* doctype);

    // Writes a dictionary as a document whose root and doctype are the class: `className`, or if null the
    // entry "__class__", without which the result is -1. The version is `version` if true, else the entry
    // "__version__", else "2.0". Throws as storeXmlTree.
    static int storeDict(const Any& path, const AnyDict& dict, const char* className = nullptr,
                         const Any& version = Any());
    // Reads it again: 0, or -1 if the file can't be read, holds nothing or is beyond a limit, with the reason
    // in the debug log.
    // "__class__" is the root's name, which is also `rootName`; `version` is a String, or the Int32 -1 if the
    // document has none. `dict` never keeps what it held before.
    static int restoreDict(const Any& path, AnyDict& dict, Any& rootName, Any& version);

  private:
    struct Watch;  // what the limits count during a parse

    XmlNodeStack _parseStack;
    XmlNode* _root = nullptr;
    Watch* _watch = nullptr;
    long long _bytes = 0;  // of the document that the tree came from

    void startElementHandler(const char* name, const char** attrs);
    void endElementHandler(const char* name);
    void dataHandler(const char* text, int size);
    static void s_startElementHandler(void* self, const char* name, const char** attrs);
    static void s_endElementHandler(void* self, const char* name);
    static void s_dataHandler(void* self, const char* text, int size);
    void parseStream(void* stream, const Any& path);
    void _cleanup();
};

// Any bytes as a stored document: restoring never crashes, hangs or takes memory without bound, and what it
// gives can be stored, restored and stored again with the same bytes.
#include "core/arch/qvexception.h"
#include "core/document/xmldom.h"
#include "core/document/xmltrans.h"
#include "tests/fuzz/fuzz.h"

namespace {

bool store(const MemoryFile& file, const AnyDict& dict) {
    try {
        return XmlParser::storeDict(file.name(), dict) == 0;
    } catch (const QvFileException&) {
        return false;  // nested one level too deep by the new root, for instance
    }
}

void checkStoring(const AnyDict& dict) {
    const MemoryFile first, second;
    if (!store(first, dict)) return;
    AnyDict back;
    Any root, version;
    if (XmlParser::restoreDict(first.name(), back, root, version) != 0) {
        require(first.read().find("<key") == std::string::npos);  // -1 is for a document without entries
        return;
    }
    require(store(second, back));
    AnyDict again;
    require(XmlParser::restoreDict(second.name(), again, root, version) == 0 && store(first, again));
    require(first.read() == second.read());
}

// The tree itself, and the compact form, which asserts on entries without a type.
void checkTree(const MemoryFile& file) {
    XmlParser parser;
    try {
        parser.parseFile(file.name());
        AnyDict dict;
        XmlTransCustomDict().XmlToDict(parser.topLevel(), dict);
        XmlNode node(nullptr);
        XmlTransCustomDict().AnyToXml(dict, &node);
        parser.topLevel()->stripXMLNamespace(true);
        const MemoryFile copy;
        XmlParser::storeXmlTree(copy.name(), parser.topLevel(), nullptr);
    } catch (const QvException&) {
    }
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    const MemoryFile file(data, size);
    AnyDict dict;
    Any root, version;
    if (XmlParser::restoreDict(file.name(), dict, root, version) == 0) checkStoring(dict);
    checkTree(file);
    return 0;
}

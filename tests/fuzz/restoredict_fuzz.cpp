// Any bytes as a stored document: restoring never crashes, hangs or takes memory without bound, and what it
// gives can be stored, restored and stored again with the same bytes.
#include <cstddef>
#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <string>

#include <sys/mman.h>
#include <unistd.h>

#include "core/engine/qvexception.h"
#include "core/value/xmldom.h"
#include "core/value/xmltrans.h"

namespace {

// A file in memory that can be opened by name any number of times.
class MemoryFile {
  public:
    explicit MemoryFile(const char* label)
        : descriptor_(memfd_create(label, 0)), name_("/proc/self/fd/" + std::to_string(descriptor_)) {
        if (descriptor_ < 0) std::abort();
    }
    const char* name() const { return name_.c_str(); }
    void fill(const std::uint8_t* data, std::size_t size) {
        if (ftruncate(descriptor_, 0) != 0) std::abort();
        if (pwrite(descriptor_, data, size, 0) != static_cast<ssize_t>(size)) std::abort();
    }
    std::string read() const {
        std::string bytes(static_cast<std::size_t>(lseek(descriptor_, 0, SEEK_END)), 0);
        if (pread(descriptor_, bytes.data(), bytes.size(), 0) < 0) std::abort();
        return bytes;
    }

  private:
    int descriptor_;
    std::string name_;
};

bool store(const MemoryFile& file, const AnyDict& dict) {
    try {
        return XmlParser::storeDict(file.name(), dict) == 0;
    } catch (const QvFileException&) {
        return false;  // nested one level too deep by the new root, for instance
    }
}

void checkStoring(const AnyDict& dict) {
    static MemoryFile first("first"), second("second");
    if (!store(first, dict)) return;
    AnyDict back;
    Any root, version;
    if (XmlParser::restoreDict(first.name(), back, root, version) != 0) {
        if (first.read().find("<key") != std::string::npos)
            std::abort();  // -1 is for a document without entries
        return;
    }
    if (!store(second, back)) std::abort();
    AnyDict again;
    if (XmlParser::restoreDict(second.name(), again, root, version) != 0 || !store(first, again))
        std::abort();
    if (first.read() != second.read()) std::abort();
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
        static MemoryFile copy("copy");
        XmlParser::storeXmlTree(copy.name(), parser.topLevel(), nullptr);
    } catch (const QvException&) {
    }
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    static MemoryFile file("document");
    file.fill(data, size);
    AnyDict dict;
    Any root, version;
    if (XmlParser::restoreDict(file.name(), dict, root, version) == 0) checkStoring(dict);
    checkTree(file);
    return 0;
}

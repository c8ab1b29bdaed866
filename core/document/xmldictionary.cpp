#include "core/document/xmldictionary_p.h"

#include <algorithm>
#include <string_view>
#include <vector>

#include "core/arch/qvassert.h"
#include "core/arch/qvexception.h"
#include "core/document/xmltrans.h"
#include "core/document/xmltrans_p.h"

namespace {

Any versionText(const Any& given, const AnyDict& dict) {
    const Any version = qvXmlVersionText(given.isTrue() ? given : dict.get("__version__"));
    return version.isTrue() ? version : Any("2.0");
}

// A class name that is no text is a broken contract: a line in the log, and false.
bool hasClass(const Any& className) {
    try {
        QV_ASSERT(className.isString());
        return true;
    } catch (const QvAssertFailure&) {
        return false;
    }
}

// An element that is read as a dictionary of this class.
bool isObject(const XmlNode& node) {
    if (qvXmlTypeOf(node.name())) return false;
    for (const std::string_view part : {"key", "ent", "val"})
        if (node.name() == part) return false;
    return true;
}

}  // namespace

bool qvHoldsTooManyObjects(const XmlNode& root, long long bytes) {
    const long long most = std::max<long long>(XmlParser::maxObjects, bytes / XmlParser::bytesPerObject);
    long long objects = 0;
    std::vector<const XmlNode*> pending{&root};
    while (!pending.empty() && objects <= most) {
        const XmlNode* const node = pending.back();
        pending.pop_back();
        objects += isObject(*node) ? 1 : 0;
        for (int i = node->nrChildren() - 1; i >= 0; --i) pending.push_back(node->child(i));
    }
    return objects > most;
}

int qvStoreXmlDict(const Any& path, const AnyDict& dict, const char* className, const Any& version) {
    const Any name = className ? Any(className) : dict.get("__class__");
    if (!hasClass(name)) return -1;
    XmlNode root(name.asString());
    XmlTrans().DictToXml(dict, &root);
    root.setName(name.asString());
    root.setAttr("version", versionText(version, dict));
    return XmlParser::storeXmlTree(path, &root, name.asString());
}

void qvDictOfXml(XmlNode& root, AnyDict& dict) {
    const bool wrapped = root.nrChildren() == 1 && root.child(0)->name() == std::string_view("dict");
    XmlNode& node = wrapped ? *root.child(0) : root;
    node.setAttr("class", root.name());
    XmlTrans().XmlToDict(&node, dict);
}

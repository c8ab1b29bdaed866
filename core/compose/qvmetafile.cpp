#include "core/compose/qvmetafile.h"

#include <cstring>
#include <utility>

#include "core/arch/qvassert.h"
#include "core/arch/qvexception.h"
#include "core/compose/xmltransmetafile_p.h"
#include "core/document/xmldom.h"
#include "core/engine/files/qvfileutil.h"
#include "core/engine/modules/qvcodec.h"
#include "core/engine/qvutil.h"
#include "core/engine/status.h"

namespace {

constexpr int notReadable = -15;
constexpr const char* rootName = "Metafile";
constexpr const char* noRoot = "Invalid metafile syntax - missing <Metafile> tag.";

bool hasRoot(XmlParser& parser) {
    const XmlNode* root = parser.topLevel();
    return root && root->name() && std::strncmp(root->name(), rootName, std::strlen(rootName)) == 0;
}

AnyDict& handlers() {
    static AnyDict all;
    return all;
}

}  // namespace

struct QvMetafile::Private {
    AnyVector names;
    AnyVector elements;
    Any errorDesc{""};
    int errorCode = QvStatus::ok;
};

QvMetafile::QvMetafile() : p_(std::make_shared<Private>()) {}

QvMetafile::QvMetafile(const Any& path) : QvMetafile() { p_->errorCode = open(path); }

QvMetafile::~QvMetafile() = default;

int QvMetafile::open(const Any& path) {
    XmlParser parser;
    p_->names.clear();
    p_->elements.clear();
    try {
        p_->errorCode = parser.parseFile(path);
    } catch (const QvFileException& failure) {
        p_->errorDesc = failure.what();
        p_->errorCode = notReadable;
    }
    if (p_->errorCode != QvStatus::ok) return p_->errorCode;
    if (!hasRoot(parser)) {
        p_->errorDesc = noRoot;
        return p_->errorCode = notReadable;
    }
    AnyDict disposable;
    XmlTransMetafile translator(QvFile::getPath(path));
    translator.XmlToDict(parser.topLevel(), disposable);
    QvUtil::debugOutDict(disposable);
    QV_ASSERT_MSG(disposable.get("names").isVector(), "disposable.get(\"names\").isVector()");
    QV_ASSERT_MSG(disposable.get("elements").isVector(), "disposable.get(\"elements\").isVector()");
    p_->names.swap(disposable.get("names").asVector());
    p_->elements.swap(disposable.get("elements").asVector());
    return QvStatus::ok;
}

std::string QvMetafile::check(const Any& path) {
    XmlParser parser;
    try {
        if (parser.parseFile(path) != QvStatus::ok) return "it is not well formed";
    } catch (const QvFileException& failure) {
        return failure.what();
    }
    if (!hasRoot(parser)) return noRoot;
    std::string fault;
    AnyDict ignored;
    XmlTransMetafile(QvFile::getPath(path), &fault).XmlToDict(parser.topLevel(), ignored);
    return fault;
}

int QvMetafile::save(const Any& path) {
    XmlNode root(rootName);
    XmlTransMetafile translator;
    for (int i = 0; i < nrElements(); ++i) {
        auto node = std::make_unique<XmlNode>(elementName(i));
        XmlTrans* handler = getHandler(elementName(i));
        (handler ? handler : &translator)->AnyToXml(element(i), node.get());
        root.addChild(node.get());
        node.release();
    }
    return XmlParser::storeXmlTree(path, &root, nullptr);
}

int QvMetafile::saveDecoder(QvCodec* decoder, const Any& path) {
    QV_ASSERT_MSG(decoder, "decoder");
    QV_ASSERT_MSG(path.isText(), "path.isString() || path.isWString()");
    QV_ASSERT_MSG(path.isTrue(), "path.size() > 0");
    const Any isMeta = decoder->getParam("isMeta");
    const Any data = isMeta.isInt() && isMeta.isTrue() ? decoder->getParam("metaData") : Any();
    if (!data.isVector() || data.asVector().empty()) {
        p_->errorDesc =
            Any::sprintf("Decoder %s doesn't provide valid 'metaData' parameter", decoder->name());
        return QvStatus::failed;
    }
    const AnyVector& pairs = data.asVector();
    QV_ASSERT_MSG(pairs.size() % 2 == 0, "metaData.size() % 2 == 0");
    for (int i = 0; i < pairs.size(); i += 2) {
        QV_ASSERT_MSG(pairs.at(i).isString(), "name.isString()");
        QV_ASSERT_MSG(pairs.at(i + 1).isValid(), "data.isValid()");
        addElement(pairs.at(i).asString(), pairs.at(i + 1));
    }
    return save(path);
}

int QvMetafile::nrElements() const { return p_->names.size(); }

const char* QvMetafile::elementName(int index) const {
    return std::as_const(p_->names).at(index).asString(nullptr);
}

const Any& QvMetafile::element(int index) const { return std::as_const(p_->elements).at(index); }

const Any& QvMetafile::element(const char* name) const {
    const int index = name ? p_->names.indexOf(Any(name)) : -1;
    return index < 0 ? Any::invalid() : element(index);
}

bool QvMetafile::contains(const char* name) const { return name && p_->names.contains(Any(name)); }

void QvMetafile::addElement(const char* name, const Any& value) {
    p_->names.append(Any(name));
    p_->elements.append(value);
}

int QvMetafile::errorCode() const { return p_->errorCode; }

const char* QvMetafile::errorDesc() const { return p_->errorDesc.asString(""); }

void QvMetafile::registerHandler(const char* tag, XmlTrans* handler) {
    handlers().set(tag, Any(static_cast<const void*>(handler)));
}

void QvMetafile::unregisterHandler(const char* tag) { handlers().remove(tag); }

XmlTrans* QvMetafile::getHandler(const char* tag) {
    return tag ? static_cast<XmlTrans*>(handlers().get(tag).asGeneric(nullptr)) : nullptr;
}

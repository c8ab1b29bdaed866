#include "core/compose/qvviewsetup.h"

#include <array>
#include <cstring>
#include <memory>
#include <utility>

#include "core/compose/qvmetafile.h"
#include "core/document/xmltrans.h"
#include "core/engine/files/qvfileutil.h"
#include "core/value/numbertext_p.h"

namespace {

constexpr const char* elementName = "MVInterleave";
constexpr int maxStream = 255;

constexpr std::array layoutTexts = {"interleaved",  "swapped", "side-by-side", "top-bottom",
                                    "line-by-line", "left",    "right"};
static_assert(layoutTexts.size() == static_cast<std::size_t>(QvViewLayout::right) + 1);

XmlNode& addNode(XmlNode& parent, const char* name) {
    auto node = std::make_unique<XmlNode>(name);
    parent.addChild(node.get());
    return *node.release();
}

std::string textOf(const Any& value) { return value.toString().asString(""); }

// Reads what is there; restore() says what is wrong with it.
class ViewElement : public XmlTrans {
  public:
    void XmlToAny(const XmlNode* from, Any& to) override {
        if (!isElement(*from)) return XmlTrans::XmlToAny(from, to);
        to = AnyDict();
        XmlToDict(from, to.asDict());
    }

    void XmlToDict(const XmlNode* from, AnyDict& to) override {
        if (!isElement(*from)) return XmlTrans::XmlToDict(from, to);
        to.set("__class__", elementName);
        if (from->getAttr("layout").isValid()) to.set("layout", from->getAttr("layout"));
        AnyVector& views = to.set("views", AnyVector()).asVector();
        for (int i = 0; i < from->nrChildren(); ++i)
            if (const XmlNode& child = *from->child(i); child.name() && !std::strcmp(child.name(), "view"))
                views.append(readView(child));
    }

    void AnyToXml(const Any& from, XmlNode* to) override {
        if (!isElement(*to) || !from.isDict()) return XmlTrans::AnyToXml(from, to);
        const AnyDict& setup = from.asDict();
        if (setup.get("layout").isText()) to->setAttr("layout", setup.get("layout").toString());
        if (!setup.get("views").isVector()) return;
        for (const Any& entry : setup.getVector("views"))
            if (entry.isDict()) writeView(entry.asDict(), addNode(*to, "view"));
    }

  private:
    static bool isElement(const XmlNode& node) {
        return node.name() && std::strcmp(node.name(), elementName) == 0;
    }

    Any readView(const XmlNode& node) {
        AnyDict view("file", node.getAttr("file"));
        if (node.getAttr("stream").isValid())
            view.set("stream", qvParseInt32(textOf(node.getAttr("stream"))));
        if (node.nrChildren() > 0) {
            Any state;
            XmlTrans::XmlToAny(node.child(0), state);
            view.set("state", state);
        }
        return Any(view);
    }

    void writeView(const AnyDict& view, XmlNode& to) {
        if (view.get("file").isText()) to.setAttr("file", view.get("file").toString());
        to.setAttr("stream", Any::sprintf("%d", view.getInt32("stream")));
        if (view.get("state").isDict() && !view.get("state").asDict().empty())
            XmlTrans::AnyToXml(view.get("state"), &addNode(to, "dict"));
    }
};

std::string numbered(std::size_t index) { return "view " + std::to_string(index + 1); }

// What is wrong with an entry of "views"; empty if nothing is.
std::string readEntry(const Any& entry, QvViewSetup::View& view) {
    if (!entry.isDict()) return "it is no view";
    const AnyDict& dict = entry.asDict();
    if (dict.isSet("state")) {
        if (!dict.get("state").isDict() || !dict.get("state").asDict().get("name").isString())
            return "its decoder has no name";
        view.state = dict.get("state").asDict();
        // They were counted by stream; a view has one.
        for (const char* overrides : {"vidsOverride", "audsOverride", "subsOverride"})
            view.state.remove(overrides);
    }
    view.file = dict.get("file").isText() ? dict.get("file") : Any("");
    if (view.file.size() == 0 && view.state.empty()) return "it names no file";
    if (dict.isSet("stream") && !dict.get("stream").isInt32()) return "its stream is no number";
    view.stream = dict.getInt32("stream");
    if (view.stream < 0 || view.stream > maxStream)
        return "its stream " + std::to_string(view.stream) + " is not from 0 to " + std::to_string(maxStream);
    return "";
}

}  // namespace

const char* QvViewSetup::layoutName(QvViewLayout layout) {
    return layoutTexts[static_cast<std::size_t>(layout)];
}

bool QvViewSetup::findLayout(std::string_view name, QvViewLayout& layout) {
    for (std::size_t i = 0; i < layoutTexts.size(); ++i) {
        if (name != layoutTexts[i]) continue;
        layout = static_cast<QvViewLayout>(i);
        return true;
    }
    return false;
}

std::vector<std::string> QvViewSetup::layoutNames() { return {layoutTexts.begin(), layoutTexts.end()}; }

void QvViewSetup::store(AnyDict& dict) const {
    AnyVector list;
    for (const View& view : views) {
        AnyDict entry("file", view.file, "stream", view.stream);
        if (!view.state.empty()) entry.set("state", view.state);
        list.append(Any(entry));
    }
    dict = AnyDict("__class__", elementName, "layout", layoutName(layout), "views", list);
}

std::string QvViewSetup::restore(const AnyDict& dict) {
    QvViewSetup read;
    if (const Any& name = dict.get("layout"); name.isValid() && !findLayout(textOf(name), read.layout))
        return "'" + textOf(name) + "' is no layout of views";
    if (!dict.get("views").isVector() || dict.getVector("views").empty()) return "it has no views";
    const AnyVector& list = dict.getVector("views");
    if (list.size() > maxViews)
        return "it has " + std::to_string(list.size()) + " views, more than " + std::to_string(maxViews);
    for (const Any& entry : list) {
        View& view = read.views.emplace_back();
        if (const std::string fault = readEntry(entry, view); !fault.empty())
            return numbered(read.views.size() - 1) + ": " + fault;
    }
    *this = std::move(read);
    return "";
}

int QvViewSetup::save(const Any& path) const {
    registerElement();
    AnyDict dict;
    store(dict);
    QvMetafile file;
    file.addElement(elementName, Any(dict));
    return file.save(path);
}

std::string QvViewSetup::load(const Any& path, bool* isNone) {
    registerElement();
    if (isNone) *isNone = true;
    // Opening a damaged one may end in an assertion.
    if (const std::string fault = QvMetafile::check(path); !fault.empty()) return fault;
    const QvMetafile file(path);
    const Any& element = file.element(elementName);
    if (!element.isDict()) return "it holds no views";
    if (isNone) *isNone = false;
    QvViewSetup read;
    if (const std::string fault = read.restore(element.asDict()); !fault.empty()) return fault;
    const Any folder = QvFile::getPath(path);
    for (View& view : read.views)
        if (view.file.size() > 0 && !QvFile::isAbsolutePath(view.file))
            view.file = QvFile::joinPath(folder, view.file);
    *this = std::move(read);
    return "";
}

void QvViewSetup::registerElement() {
    static ViewElement element;
    if (!QvMetafile::getHandler(elementName)) QvMetafile::registerHandler(elementName, &element);
}

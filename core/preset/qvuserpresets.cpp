#include "core/preset/qvuserpresets.h"

#include <cstring>
#include <utility>

#include "core/arch/qvassert.h"
#include "core/arch/qvexception.h"
#include "core/document/xmldom.h"
#include "core/encode/qvencodepipe.h"
#include "core/engine/log/qvlog.h"
#include "core/engine/status.h"
#include "core/engine/threads/qvtimer.h"
#include "core/preset/loadedpresets_p.h"
#include "core/preset/oldpresets_p.h"
#include "core/preset/storedequal_p.h"
#include "core/preset/substitution_p.h"

namespace {

constexpr const char* kClass = "UserPresets";
constexpr const char* kVersion = "2.0";

enum Form { unknown = 0, old = 1, current = 2 };

struct FormRow {
    Form form;
    const char* className;
    const char* key;  // of the vector of presets
};

constexpr FormRow kForms[] = {{current, kClass, "presets"}, {old, "userprofiles", "user"}};

// A file of presets, as it was read.
struct Document {
    AnyDict dict;
    Any className, version;
    Form form = unknown;
    Any presets;

    int read(const Any& file) {
        const int result = XmlParser::restoreDict(file, dict, className, version);
        if (result != QvStatus::ok) return result;
        for (const FormRow& row : kForms) {
            if (!className.isString() || std::strcmp(className.asString(), row.className) != 0) continue;
            form = row.form;
            presets = dict.get(row.key);
        }
        return QvStatus::ok;
    }
};

// Null if a preset of the current form can be taken.
const char* faultOf(const Any& element) {
    if (!element.isDict() || !element.asDict().isSet("__version__"))
        return "QvUserPresets._importV2: invalid preset structure";
    if (!element.asDict().get("name").isText()) return "QvUserPresets.import: 'name' not defined";
    return nullptr;
}

void textToString(AnyDict& preset, const char* key) {
    if (preset.get(key).isWString()) preset.set(key, preset.get(key).toString());
}

int importCurrent(const AnyVector& presets, QvLoadedPresets& to) {
    for (const Any& element : presets) {
        if (const char* const fault = faultOf(element)) QV_FAIL(fault);
        QvPreset preset(element.asDict());
        for (const char* mark : {"#valid", "#err"}) preset.remove(mark);  // of another program's run
        textToString(preset, "name");
        textToString(preset, "shortName");
        to.add(std::move(preset));
    }
    return QvStatus::ok;
}

// What the parser says of a file that it does not take.
std::string whyUnreadable(const Any& file) {
    try {
        XmlParser().parseFile(file);
    } catch (const QvFileException& failure) {
        return failure.what();
    }
    return "it is beyond the limits of a document";
}

}  // namespace

QvPreset QvUserPresets::at(int index) const {
    QV_ASSERT(index >= 0 && index < size());
    return preset(index);
}

QvPreset QvUserPresets::get(const char* name) const {
    const int index = indexOf(name);
    QV_ASSERT(index >= 0);
    return preset(index);
}

AnyVector QvUserPresets::getNames() const {
    AnyVector names;
    for (int i = 0; i < size(); ++i) names.append(Any(preset(i).name()));
    return names;
}

void QvUserPresets::profile(const char* name, AnyDict& preset) const {
    const int index = indexOf(name);
    preset = index < 0 ? AnyDict() : static_cast<const AnyDict&>(this->preset(index));
}

void QvUserPresets::set(const char* name, const QvPreset& preset) {
    QvPreset copy = preset;
    copy.setName(name);
    const int index = indexOf(name);
    if (index < 0)
        QvPresetList::append(static_cast<const AnyDict&>(copy));
    else
        AnyVector::set(index, Any(copy));
    modified_ = true;
}

int QvUserPresets::append(const QvPreset& preset) {
    if (contains(preset.name())) return QvStatus::failed;
    QvPresetList::append(static_cast<const AnyDict&>(preset));
    modified_ = true;
    return size() - 1;
}

int QvUserPresets::create(const char* name, const QvEncodePipe* pipe) {
    if (contains(name)) return QvStatus::failed;
    QvPreset preset(pipe, name);
    preset.setShortName(name);
    set(name, preset);
    return QvStatus::ok;
}

int QvUserPresets::apply(const char* name, QvEncodePipe* pipe, int keep, int, int) const {
    const int index = indexOf(name);
    return index < 0 ? QvStatus::failed : pipe->applyPreset(preset(index), keep);
}

int QvUserPresets::rename(int index, const char* name) {
    QvPreset renamed = at(index);
    if (const int used = indexOf(name); used >= 0) return used == index ? QvStatus::ok : QvStatus::failed;
    renamed.setName(name);
    AnyVector::set(index, Any(renamed));
    modified_ = true;
    return QvStatus::ok;
}

int QvUserPresets::rename(const char* from, const char* to) {
    if (std::strcmp(from, to) == 0) return QvStatus::ok;
    const int index = indexOf(from);
    return index < 0 ? QvStatus::failed : rename(index, to);
}

void QvUserPresets::remove(const char* name) {
    if (const int index = indexOf(name); index >= 0) remove(index);
}

void QvUserPresets::remove(int index) {
    QV_ASSERT(index >= 0 && index < size());
    AnyVector::remove(index);
    modified_ = true;
}

void QvUserPresets::clear() {
    AnyVector::clear();
    modified_ = true;
}

// What fails changes nothing: the list is exchanged when all has been read.
int QvUserPresets::load(const Any& file, int mode, int* version) {
    QvTimer timer;
    Document document;
    const int read = document.read(file);
    qv_dbg()->debug("[UserPresets] load - restoreDict: %f", timer.stop());
    if (read != QvStatus::ok) return read;
    if (document.form == unknown) return QvStatus::failed;
    QV_ASSERT(document.presets.isVector());
    timer.start();
    QvPresetList list;
    if (mode != clearFirst) list = *this;
    using Names = QvLoadedPresets::Names;
    QvLoadedPresets loaded(list, mode == clearFirst   ? Names::asTheyAre
                                 : (mode & overwrite) ? Names::replace
                                                      : Names::number);
    const AnyVector& presets = document.presets.asVector();
    const int result = document.form == current ? importCurrent(presets, loaded)  //
                                                : qvImportOldPresets(presets, loaded);
    swap(list);
    qv_dbg()->debug("[UserPresets] load - import: %f", timer.stop());
    modified_ = false;
    if (version) *version = document.form;
    return result;
}

std::string QvUserPresets::check(const Any& file) {
    Document document;
    if (document.read(file) != QvStatus::ok) return whyUnreadable(file);
    if (document.form == unknown)
        return std::string("it is no file of presets, but of '") +
               document.className.toString().asString("") + "'";
    const char* const key = document.form == current ? kForms[0].key : kForms[1].key;
    if (!document.presets.isVector()) return std::string("it has no list '") + key + "'";
    const AnyVector& presets = document.presets.asVector();
    for (int i = 0; i < presets.size(); ++i) {
        const char* const fault =
            document.form == current ? faultOf(presets.at(i)) : qvFaultOfOldPreset(presets.at(i));
        if (fault) return "preset " + std::to_string(i + 1) + ": " + fault;
    }
    return "";
}

int QvUserPresets::save(const Any& file) {
    const int result = XmlParser::storeDict(file, AnyDict("presets", static_cast<const AnyVector&>(*this)),
                                            kClass, kVersion);
    if (result == QvStatus::ok) modified_ = false;
    return result;
}

int QvUserPresets::checkPresets(int flags) {
    int valid = 0;
    QvPresetList checked;
    for (int i = 0; i < size(); ++i) {
        QvPreset preset = this->preset(i);
        if (flags & substituteModules) qvSubstituteModules(preset);
        const bool isValid = preset.checkValid();
        if (!isValid && (flags & removeInvalid)) continue;
        if (isValid || (flags & describeInvalid)) preset.createInfo();
        valid += isValid ? 1 : 0;
        checked.append(static_cast<const AnyDict&>(preset));
    }
    const bool changed = !qvStoredEqual(Any(static_cast<const AnyVector&>(checked)),
                                        Any(static_cast<const AnyVector&>(*this)));
    swap(checked);
    modified_ = modified_ || changed;
    return valid;
}

bool QvUserPresets::operator==(const QvUserPresets& other) const {
    return qvStoredEqual(Any(static_cast<const AnyVector&>(*this)),
                         Any(static_cast<const AnyVector&>(other)));
}

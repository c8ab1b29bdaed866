#include "core/engine/modules/qvregistry.h"

#include <algorithm>
#include <cctype>

#include "core/arch/platform.h"
#include "core/arch/qvassert.h"
#include "core/engine/files/qvfileutil.h"
#include "core/engine/log/qvlog.h"
#include "core/engine/modules/decoderchoice_p.h"
#include "core/engine/modules/moduleoverrides_p.h"
#include "core/engine/modules/pluginfile_p.h"
#include "core/engine/modules/qvcodec.h"
#include "core/engine/modules/qvmodule.h"
#include "core/engine/modules/qvplugin.h"
#include "core/engine/modules/qvregistry_p.h"
#include "core/engine/qvutil.h"
#include "core/engine/status.h"

namespace {

constexpr char optionsKey[] = "dbgOpts";

// A slash is the root on this system; the other two forms come with configurations from elsewhere.
bool isAbsolute(const Any& path) {
    const Any narrow = path.toString();
    const char* text = narrow.asString("");
    return text[0] == '/' || (narrow.size() > 2 && (text[1] == ':' || (text[0] == '\\' && text[1] == '\\')));
}

Any fontFile(QvFontFace face) { return Any(qv_platform().fontFile(face).c_str()); }

QvFontFace faceFor(int monospace, QvFontFace proportional) {
    return monospace ? QvFontFace::monospaceBold : proportional;
}

const char* withoutAlias(const char* name) {
    const Any asked(name);
    return asked == "colorconv" || asked == "scaler2" ? "scaler" : name;
}

QvKnownModules allModules(const std::deque<QvPlugin*>& plugins) {
    QvKnownModules found;
    for (const QvPlugin* plugin : plugins)
        for (int i = 0; i < plugin->nrModules(); ++i) found.push_back(plugin->module(i));
    return found;
}

}  // namespace

int QvRegistry::g_initialized = 0;

QvRegistry* qv_registry() {
    static QvRegistry registry;
    return QvRegistry::g_initialized ? &registry : nullptr;
}

QvRegistry::QvRegistry() : p_(std::make_unique<QvRegistry_p>()) { g_initialized = 1; }

QvRegistry::~QvRegistry() {
    p_.reset();
    g_initialized = 0;
}

// --- Configuration

void QvRegistry::setConfig(AnyDict config) {
    config_ = config;
    if (config_.empty()) return;
    qv_dbg()->debug("[Registry] configuration set to:");
    QvUtil::debugOutDict(config_);
}

AnyDict QvRegistry::config() const { return config_; }

Any QvRegistry::tempDir() const {
    const Any& configured = config_.get("temp_dir");
    return configured.isTrue() ? configured : QvUtil::tempDir();
}

Any QvRegistry::userSettingsDir(bool doNotCreate) const {
    const Any& configured = config_.get("userSettingsDir");
    Any folder = configured.isTrue() ? configured : Any(".QVTarselSdk");
    if (!isAbsolute(folder)) folder = QvFile::joinPath(QvFile::homeDir(), folder);
    if (!doNotCreate && !QvFile::isDir(folder)) QvFile::mkdir(folder);
    return folder;
}

bool QvRegistry::throwParamException() const { return config_.get("disable_exceptions").isFalse(); }

Any QvRegistry::getDbgOption(const char* name) const {
    const Any& options = p_->options.get(optionsKey);
    if (options.isDict() && options.asDict().isSet(name)) return options.asDict().get(name);
    return Any(name) == "log_setparam" ? Any(1) : Any();
}

void QvRegistry::setDbgOption(const char* name, const Any& value) {
    if (!p_->options.isSet(optionsKey)) p_->options.set(optionsKey, AnyDict());
    p_->options.get(optionsKey).asDict().set(name, value);
}

Any QvRegistry::defaultFontFile(int monospace) const {
    return fontFile(faceFor(monospace, QvFontFace::sans));
}

Any QvRegistry::defaultFontFileItalic(int monospace) const {
    return fontFile(faceFor(monospace, QvFontFace::sansItalic));
}

Any QvRegistry::defaultFontFileBold(int monospace) const {
    return fontFile(faceFor(monospace, QvFontFace::sansBold));
}

bool QvRegistry::hasFontFamily(const char* family) const {
    return family && *family && !qv_platform().fontOf(family, QvFontFace::sans).name.empty();
}

AnyVector QvRegistry::fontFamilies() const {
    AnyVector names;
    for (const std::string& family : qv_platform().fontFamilies()) names.append(family.c_str());
    return names;
}

QvPresetMgr* QvRegistry::presetMgr() const { return p_->presets.get(); }
void QvRegistry::installLogger(QvLogBase* logger) { qv_dbg()->setLogger(logger); }
QvLogBase* QvRegistry::logger() const { return qv_dbg()->logger(); }

void QvRegistry::setExternalDecoderIO(const QvExternalIO* io) { p_->externalIO = io ? *io : QvExternalIO{}; }

const QvExternalIO* QvRegistry::externalDecoderIO() const {
    return p_->externalIO.words[3] ? &p_->externalIO : nullptr;
}

// --- Plug-ins

void QvRegistry::setPluginFolder(const Any& folder) { pluginFolder_ = folder; }
Any QvRegistry::getPluginFolder() const { return pluginFolder_; }

int QvRegistry::scanFolder(const Any& folder) {
    if (folder.isTrue()) setPluginFolder(folder);
    AnyVector files;
    if (pluginFolder_.isText()) get_folder_plugin_dlls(pluginFolder_, &files);
    if (files.empty()) {
        const Any name = pluginFolder_.toString();
        qv_dbg()->debug("[Registry] No plugins found in %s", name.asString(""));
        return QvStatus::failed;
    }
    for (const Any& file : files) loadPlugin(file);
    qvPresetHook().update(*presetMgr());
    return QvStatus::ok;
}

int QvRegistry::loadPlugin(const Any& file) {
    const Any name = file.toString();
    qv_dbg()->debug("[Registry] Loading plugin: %s", name.asString(""));
    auto alreadyLoaded = [&](const QvPlugin* loaded) { return loaded->getAttr("filename") == file; };
    if (std::any_of(plugins_.begin(), plugins_.end(), alreadyLoaded)) {
        qv_dbg()->debug("[Registry] Already loaded, skipping");
        return QvStatus::ok;
    }
    std::erase_if(p_->failures, [&](const QvPluginFailure& earlier) { return earlier.file == file; });
    const QvLoadingPlugin note(name.asString(""));
    const QvPluginLoad loaded = qvLoadPluginFile(file, config_.get("allow_unsafe_plugins").isTrue());
    QvPlugin* const plugin = loaded.plugin;
    if (!plugin) {
        p_->failures.push_back({file, loaded.fault, loaded.reason});
        return QvStatus::pluginNotLoaded;
    }
    if (std::find(plugins_.begin(), plugins_.end(), plugin) != plugins_.end()) {
        // The same file under another name: its one plug-in is in the list.
        qvReleasePluginFile(*plugin);
        qv_dbg()->debug("[Registry] Already loaded, skipping");
        return QvStatus::ok;
    }
    plugin->setAttr("filename", file);
    const Any version = plugin->getAttr("version");
    const Any date = plugin->getAttr("versionDate");
    keepDefaults(*plugin);
    plugins_.push_back(plugin);
    qv_dbg()->debug("[Registry] Loaded %s (%s %s), containing %d module(s)", plugin->name().asString(""),
                    version.isTrue() ? version.asString("") : "N/A",
                    version.isTrue() ? date.asString("") : "N/A", plugin->nrModules());
    return QvStatus::ok;
}

const std::vector<QvPluginFailure>& QvRegistry::pluginFailures() const { return p_->failures; }
const char* QvRegistry::loadingPlugin() { return QvLoadingPlugin::file(); }

int QvRegistry::addPlugin(QvPlugin* plugin) {
    QV_ASSERT_MSG(plugin, "invalid ptr");
    plugin->setAttr("filename", "builtin");
    plugin->setAttr("debug", 0);
    plugin->setAttr("version", QvUtil::libraryVersion());
    plugin->setAttr("versionDate", QvUtil::buildDate());
    keepDefaults(*plugin);
    qv_dbg()->debug("[Registry] Added %s (%s %s), containing %d module(s)", plugin->desc().asString(""),
                    QvUtil::libraryVersion().asString(""), QvUtil::buildDate().asString(""),
                    plugin->nrModules());
    plugins_.push_back(plugin);
    return QvStatus::ok;
}

void QvRegistry::keepDefaults(const QvPlugin& plugin) {
    for (int i = 0; i < plugin.nrModules(); ++i) {
        AnyDict attributes;
        plugin.module(i)->getAttrs(attributes);
        moduleDefaults_.set(plugin.module(i)->name(), attributes);
    }
}

int QvRegistry::nrPlugins() const { return static_cast<int>(plugins_.size()); }

QvPlugin* QvRegistry::plugin(int index) const {
    return index >= 0 && index < nrPlugins() ? plugins_[static_cast<std::size_t>(index)] : nullptr;
}

QvPlugin* QvRegistry::plugin(const char* name) const {
    for (QvPlugin* plugin : plugins_)
        if (name && plugin->name() == name) return plugin;
    return nullptr;
}

void QvRegistry::unload(QvPlugin* plugin) {
    std::erase(plugins_, plugin);
    qvUnloadPluginFile(*plugin);
}

void QvRegistry::cleanup() {
    while (!plugins_.empty()) unload(plugins_.front());
    p_->failures.clear();
    qv_dbg()->setLogger(nullptr);
}

// --- Modules

int QvRegistry::nrModules(int type) const {
    int count = 0;
    for (const QvPlugin* plugin : plugins_)
        for (int i = 0; i < plugin->nrModules(); ++i)
            if (type == 0 || plugin->module(i)->getAttr("type") == Any(type)) ++count;
    return count;
}

QvModule* QvRegistry::module(int index) const {
    for (const QvPlugin* plugin : plugins_) {
        if (index < plugin->nrModules()) return plugin->module(index);
        index -= plugin->nrModules();
    }
    return nullptr;
}

QvModule* QvRegistry::module(const char* name) const {
    if (!name) return nullptr;
    const Any wanted(withoutAlias(name));
    for (const QvPlugin* plugin : plugins_)
        for (int i = 0; i < plugin->nrModules(); ++i)
            if (wanted == plugin->module(i)->name()) return plugin->module(i);
    return nullptr;
}

QvCodec* QvRegistry::newCodec(const char* name) {
    QvModule* found = module(name);
    std::unique_ptr<QvCodec> codec(found ? found->create() : nullptr);
    if (!codec || codec->init() != QvStatus::ok) return nullptr;
    return codec.release();
}

AnyVector QvRegistry::modules(int type) const {
    return type ? modules(AnyVector(Any(type))) : modules(AnyVector());
}

AnyVector QvRegistry::modules(const AnyVector& types) const {
    AnyVector found;
    for (QvModule* module : allModules(plugins_)) {
        const Any type = module->getAttr("type");
        if (!types.empty() && !(type.isInt32() && types.contains(type))) continue;
        AnyDict row;
        row.set("name", module->name());
        row.set("desc", module->desc());
        row.set("module", static_cast<const void*>(module));
        found.append(row);
    }
    return found;
}

bool QvRegistry::isModuleEnabled(const char* name) const {
    const QvModule* found = module(name);
    return found && !qvIsDisabled(*found);
}

const AnyDict* QvRegistry::moduleDefaults(const char* name) const {
    const Any& defaults = moduleDefaults_.get(name);
    return defaults.isDict() ? &defaults.asDict() : nullptr;
}

bool QvRegistry::isOverriden(const QvModule* module) const {
    const AnyDict* defaults = module ? moduleDefaults(module->name()) : nullptr;
    return defaults && qvIsOverridden(*module, *defaults);
}

void QvRegistry::getModuleOverrides(AnyDict& overrides) const { qvCollectOverrides(*this, overrides); }
void QvRegistry::setModuleOverrides(const AnyDict& overrides) { qvApplyOverrides(*this, overrides); }

AnyVector* QvRegistry::inputExts(bool dot, bool star) const {
    return qvInputExtensions(allModules(plugins_), dot, star).release();
}
AnyVector QvRegistry::decoders(const char* ext) const { return qvDecodersFor(allModules(plugins_), ext); }

// The door of the codec plug-in: its table of modules. It has no codec library under it.
#include <memory>

#include "core/engine/modules/qvplugin.h"
#include "core/value/any.h"
#include "plugins/av/door/avmodules.h"
#include "plugins/av/door/codeclibrary.h"

extern "C" {
QV_API unsigned qv_plugin_abi = qvPluginAbi;
}

extern "C" QV_API QvPlugin* plugin_init() {
    static QvPlugin plugin("av", "Films: codecs and containers");
    if (plugin.nrModules() == 0) {
        const auto library = std::make_shared<av::CodecLibrary>();
        av::addDecoders(plugin, library);
        av::addMultiplexers(plugin, library);
        av::addEncoders(plugin, library);
        av::addMissing(plugin);
    }
    plugin.setAttr("version", "1.0");
    plugin.setAttr("versionDate", "2026-11-22");
    return &plugin;
}

// A plug-in with the decoder of mxf_decoder.h.
#include "tests/support/mxf_decoder.h"

#include "core/engine/modules/qvplugin.h"

extern "C" {
QV_API unsigned qv_plugin_abi = qvPluginAbi;
}

extern "C" QV_API QvPlugin* plugin_init() {
    static QvPlugin plugin("mxf", "A decoder of text in the place of MXF");
    if (plugin.nrModules() == 0) plugin.addModule(new MxfModule);
    return &plugin;
}

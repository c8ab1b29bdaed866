// Plug-in files: from a name to a plug-in in memory and back.
#pragma once

class Any;
class QvPlugin;

// Loads a library and asks it for its plug-in, which gets the attribute "_dllHandle". `file` must be text.
// Null, with the reason in the debug log, if the file is no library, lacks a dependency or has no
// "plugin_init", or if that throws; null without a word if it declines. Nothing stays loaded then.
QvPlugin* qvLoadPluginFile(const Any& file);

// Releases the library of a plug-in, if it has one. While codecs of its modules are alive their code must
// stay: they are reported and the library remains in memory.
void qvUnloadPluginFile(QvPlugin& plugin);

// Gives back what a second load of a library that is in use already has taken.
void qvReleasePluginFile(const QvPlugin& plugin);

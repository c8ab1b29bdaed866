// How the framework reaches the modules that live in the library itself.
#pragma once

class QvPlugin;

// The built-in plug-in with all its modules. Defined in builtin/builtin.cpp; lives to the end of the process.
QvPlugin* qvBuiltinPlugin();

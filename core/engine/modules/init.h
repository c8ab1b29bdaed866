// Start and end of the engine in a process.
#pragma once

#include "core/arch/api.h"
#include "core/value/anycontainer.h"

// Starts the engine: debug log, configuration, folders, built-in modules. Call it before anything else, once
// or again after cleanup_wrapper. `config` is copied and may be null. Keys: "logfile" (String or WString),
// "log_callback" (borrowed QvLogBase), "temp_dir", "userSettingsDir", "disable_exceptions",
// "allow_unsafe_plugins" (true: plug-in files that other users may change are loaded, too), "threads" (Int32,
// see qvSetThreads). Always 0: a log file that can't be opened sends the log to the standard error. Plug-in
// files are not searched: follow with qv_registry()->scanFolder(folder).
//
//     AnyDict config("logfile", "tarsel.log");
//     init_wrapper(&config);
QV_API int init_wrapper(const AnyDict* config);

// Unloads all plug-ins. Codecs, tasks and filters must be gone by now; the configuration stays.
QV_API void cleanup_wrapper();

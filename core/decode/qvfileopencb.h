// How an application follows the opening of files.
#pragma once

#include "core/arch/api.h"
#include "core/value/any.h"

// What is being opened; all calls for a file go to one object.
struct QV_API QvFileOpenCbData {
    Any filename;     // the name, or the Vector of names, as the application gave it
    Any moduleName;   // the decoder being tried; invalid until the first one
    Any text;         // message of the last failure, or of the success; invalid before
    int percent = 0;  // 100 at the success of decodePipe and decodePipeUsing
    Any reason;       // with a failure: what the decoder itself said of it; invalid if it said nothing
};

// An application derives from it what it wants to know. Results are ignored. The calls come on the thread
// that opens the file. There is no virtual destructor, which would take a slot: delete by the derived type.
struct QV_API QvFileOpenCb {
    // Before a decoder is tried; also, once, for a file that no decoder takes.
    virtual int fileOpenStarted(QvFileOpenCbData& data);
    // After each failed try with -1, and with 0 after the success: one file can fail several times and then
    // succeed.
    virtual int fileOpenFinished(int result, QvFileOpenCbData& data);
    // By a decoder during a long open.
    virtual int fileOpenProgress(QvFileOpenCbData& data);
};

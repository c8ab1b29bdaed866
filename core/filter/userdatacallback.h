// What an application gives to the filter "userdata" as its parameter "callback".
#pragma once

class QvFrame;

// Called once for each frame, in order, on the thread that drives the chain. It may change samples and
// metadata of the frame but not its format or size, must not throw, and keeps no pointer to it.
//
//     void readTimecode(void* context, QvFrame& frame) { ... frame.userData() ... }
//     setup.addUserDataCallback(reinterpret_cast<const void*>(&readTimecode), &myReader, true);
using QvUserDataCallback = void (*)(void* context, QvFrame& frame);

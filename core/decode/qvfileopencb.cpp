#include "core/decode/qvfileopencb.h"

int QvFileOpenCb::fileOpenStarted(QvFileOpenCbData&) { return 0; }

int QvFileOpenCb::fileOpenFinished(int, QvFileOpenCbData&) { return 0; }

int QvFileOpenCb::fileOpenProgress(QvFileOpenCbData&) { return 0; }

// Files of one gzip stream: blocks that a decoder wants back as they were.
#pragma once

#include "core/value/any.h"

// QvFile::compress and decompress.
int qvWriteGzip(const Any& name, const unsigned char* data, int size);
int qvReadGzip(const Any& name, Any& out);

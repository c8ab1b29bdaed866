// Byte pairs from and to SCC files; the lines of a file are those of "sccfile_p.h".
#pragma once

#include <span>
#include <string>
#include <vector>

#include "core/caption/cc/qvcc.h"

// As QvCcData::readScc; from the source unless that is null. `pairs` are replaced, and stay if the result is
// not 0.
int qvReadScc(QvByteSource* source, const Any& filename, int type, bool detect, QvFramerate& rate,
              const bool* dropFrame, bool dropFrameLines, std::vector<QvCcBytePair>& pairs);
// As QvCcData::sccText.
std::string qvSccText(std::span<const QvCcBytePair> pairs, const QvFramerate& rate,
                      const QvSccWriting& options);
// 0, or -1 with the reason in the debug log.
int qvSaveScc(const Any& filename, const std::string& text);

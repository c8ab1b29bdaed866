// Metafiles with the views of a picture, and folders with a clip, as inputs.
#pragma once

#include <memory>
#include <string>
#include <vector>

#include <qvplugcore/qvplugcore.h>

// An open decoder of a metafile with views; null if it is one of something else. Throws Failure (input).
std::unique_ptr<QvDecodePipe> openViews(const std::string& name);
// Of a set-up, which messages call by `option`.
std::unique_ptr<QvDecodePipe> openViews(const std::string& option, const QvViewSetup& setup);

// Whether a folder is that of a card, or in one: it has a folder CONTENTS or CLIP, or is named so.
bool isCardFolder(const std::string& name);
// Its clip. Throws Failure (input).
std::unique_ptr<QvDecodePipe> openCard(const std::string& folder);

// The files that a decoder reads in addition to the one by which it was opened.
std::vector<std::string> inputFilesOf(const QvDecodePipe& decoder);

// What is to be made of each file of a watch folder: one preset for each target. A preset's "__target__" is a
// dictionary: "outputFolder", "presetSubfolder" (true: a folder of the preset's name below it, with "_" in
// the place of separators) and optionally "pal" (Int32: 1 or 0 sets the television standard of presets that
// leave it open).
#pragma once

#include "core/arch/api.h"
#include "core/preset/qvpreset.h"
#include "core/value/any.h"

class QvDecodePipe;
class QvEncodePipe;

class QV_API QvWatchTask : public QvPresetList {
  public:
    QvWatchTask() = default;
    explicit QvWatchTask(const QvPresetList& presets);

    int nrTargets() const { return size(); }
    // 0, or -1 if one could not be made.
    int createOutputFolders() const;
    // The name of the input file with that extension, in the target's folder.
    Any outputFilename(int target, const Any& inputFile, const char* extension) const;
    // A pipe with the target's preset and as many streams as the decoder and the preset have. It has no
    // output name: outputFilename() is the caller's to set. The caller owns it; null, with a line in the log,
    // when it can't be made.
    QvEncodePipe* createEncoder(int target, QvDecodePipe* decoder) const;

  private:
    Any _targetFolder(int target) const;
};

#include "builtin/muxers/rawmuxoutput.h"

#include <algorithm>

#include "core/engine/files/qvfileutil.h"

namespace {

void appendFile(AnyVector& files, const Any& name) {
    if (QvFile::isFile(name)) files.append(name);
}

}  // namespace

// "dir/base" + "#7" + ".ext", as the stream names them.
Any RawMuxOutput::numbered(int digitCount, int number, const Any& extension) const {
    const Any digits = Any::sprintf("#%0*d.", std::max(digitCount, 1), number);
    const Any file = Any::strcat(Any::strcat(QvFile::getBasename(name), digits), extension);
    return QvFile::joinPath(QvFile::getPath(name), file);
}

void RawMuxOutput::appendFiles(AnyVector& files) const {
    const Any extension = QvFile::getExt(name, false);
    switch (kind) {
        case oneFile:
            if (!failed) appendFile(files, name);
            break;
        case channelFiles:
            for (int channel = 0; channel < count; ++channel)
                appendFile(files, numbered(2, channel, extension));
            break;
        case pictureFiles:
            for (int picture = 0; picture < pictures; ++picture)
                appendFile(files, numbered(count, first + picture, png ? Any("png") : extension));
            break;
    }
}

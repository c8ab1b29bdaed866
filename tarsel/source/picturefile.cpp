#include "tarsel/source/picturefile.h"

#include <new>

#include <qvplugcore/qvplugcore.h>

#include "tarsel/host/files.h"
#include "tarsel/words/messages.h"

namespace {

// Whether the user log got a message of a type, QvLogMask, after its first `before`.
bool wasLogged(int before, int type) {
    AnyVector messages;
    qv_log()->getAll(messages);
    for (int i = before; i < messages.size(); ++i)
        if (messages.at(i).asDict().getInt32("type", 0) == type) return true;
    return false;
}

}  // namespace

void requirePicture(const std::string& name) {
    requireInput(name);
    AnyVector messages;
    qv_log()->getAll(messages);
    QvFrame picture;
    const int result = QvImage::loadFrame(picture, Any(name.c_str()));
    // What opens and is a PNG fails for memory only.
    if (wasLogged(messages.size(), QvLogMask::error)) throw std::bad_alloc();
    if (result != QvStatus::ok) throw failure(Msg::pictureNoPng, {name});
    if (!picture.inited() || wasLogged(messages.size(), QvLogMask::warning))
        throw failure(Msg::pictureDamaged, {name});
}

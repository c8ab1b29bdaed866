#include "tarsel/commands/savedpicture.h"

#include <cerrno>
#include <new>

#include <qvplugcore/qvplugcore.h>

#include "tarsel/host/events.h"
#include "tarsel/host/files.h"
#include "tarsel/host/signals.h"
#include "tarsel/words/messages.h"

SavedPicture::SavedPicture(const std::string& name, const std::string& option,
                           const std::vector<std::string>& inputs, const OutputOptions& options,
                           Signals& signals)
    : name_(name), signals_(signals) {
    requireNoFolder(name, "png");
    if (!(QvFile::getExt(Any(name.c_str()), true) == "png")) throw failure(Msg::pictureName, {option, name});
    outputs_ = std::make_shared<Outputs>(name, option, inputs, options.policy());
}

void SavedPicture::save(const QvFrame& picture) {
    Signals::Handlers handlers;
    handlers.second = [outputs = outputs_.get()] { return outputs->leave(); };
    const Signals::Watch watch(signals_, std::move(handlers));
    const std::string file = outputs_->begin("png");
    errno = 0;
    if (QvImage::saveFrame(picture, Any(file.c_str()), 0) != 0) {
        if (errno == ENOMEM) throw std::bad_alloc();
        if (errno != 0) throw systemFailure(Msg::outputSystem, name_, errno);
        throw failure(Msg::outputRefused, {name_, "the picture can't be converted to a PNG"});
    }
    outputs_->commit();
    signals_.complete();
    tell(Level::note, "wrote " + inQuotes(name_));
}

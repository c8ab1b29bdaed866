#include "core/transcode/run/runlinks_p.h"

#include <algorithm>
#include <new>

#include "core/arch/qvexception.h"
#include "core/encode/qvencodepipe.h"
#include "core/engine/log/qvlog.h"
#include "core/engine/status.h"
#include "core/transcode/link/translink.h"
#include "core/transcode/task/qvtranscodetask.h"

namespace qvrunlinks {

namespace {

constexpr int filmRate = 24;  // frames a second

}  // namespace

int close(const QvTask& task) {
    int result = QvStatus::ok;
    for (int i = 0; i < task.nrLinks(); ++i) {
        try {
            result |= task.getLink(i)->close();
        } catch (const std::bad_alloc&) {
            result |= QvStatus::outOfMemory;
        } catch (const QvException& failure) {
            qv_dbg()->error("Transcoder: %s", failure.what());
            result |= QvStatus::failed;
        }
    }
    return result;
}

int totalFrames(const QvTask& task, double& rate) {
    rate = filmRate;
    QvEncodePipe* pipe = task.encoder();
    if (pipe && pipe->nrStreams(qvVideoStream) > 0) {
        const Any value = pipe->QvCodec::getParam("video0/framerate");
        if (value.isFramerate()) rate = value.asFramerate().rate();
    }
    const auto links = task.links();
    int total = 0;
    if (!links.empty() && links.at(0)->type() == qvVideoStream) total = links.at(0)->totalOutFrames();
    if (total != 0) return total;
    for (int i = 0; i < links.size(); ++i) {
        const MediaTime length = links.at(i)->outPoint() - links.at(i)->inPoint();
        total = std::max(total, static_cast<int>(length.position(filmRate)));
    }
    return total;
}

}  // namespace qvrunlinks

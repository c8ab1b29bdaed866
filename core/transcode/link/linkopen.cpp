#include "core/transcode/link/linkopen_p.h"

LinkOpen::LinkOpen(const AnyDict* params) {
    if (!params) return;
    frameNumbers = params->isSet("startFrame") || params->isSet("stopFrame");
    if (const AnyVector& given = params->getVector("inOutPoints"); given.size() >= 2)
        points = InOutPoints(given);
    chapters = params->getVector("chapters");
    effects = params->getDict("effects");
    takeAudioEffects(params->getDict("audioEffects"));
    connMatrix = params->getVector("connMatrix");
    conversion = AudioConversion(params->getDict("audioConversion"));
    holdLast = params->getInt32("holdLast", 0) != 0;
    qualityStats = params->getVector("qualityStats");
    smartRender = params->getInt32("smartRender", 0);
    passPicture = params->get("smartRender").isTrue();
}

void LinkOpen::takeAudioEffects(const AnyDict& filters) { audioFilters = filters.getVector("customFilters"); }

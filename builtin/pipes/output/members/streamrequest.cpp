#include "builtin/pipes/output/members/streamrequest.h"

#include <cstring>

#include "builtin/pipes/output/members/activepreset.h"
#include "core/arch/qvassert.h"

namespace {

bool isText(const Any& value) { return value.isText() && value.isTrue(); }

std::string narrow(const Any& text) { return text.toString().asString(""); }

}  // namespace

StreamRequest StreamRequest::read(const Any& argument) {
    StreamRequest request;
    if (isText(argument)) request.codec = narrow(argument);
    if (!argument.isDict()) return request;
    for (const auto [key, value] : argument.asDict()) {
        if (std::strcmp(key, "stream") == 0 && value->isDict()) {
            request.params = value->asDict();
        } else if (std::strcmp(key, "codec") != 0) {
            QV_FAIL("EncodePipe.addStream: unrecognized parameters supplied");
        } else if (value->isDict()) {
            QV_ASSERT_MSG(isText(value->asDict().get("name")),
                          "EncodePipe.addStream: 'codec' dict must contain 'name'");
            request.codec = narrow(value->asDict().get("name"));
            request.settings = value->asDict();
        } else {
            QV_ASSERT_MSG(isText(*value), "EncodePipe.addStream: 'codec' parameter has invalid type");
            request.codec = narrow(*value);
        }
    }
    return request;
}

StreamRequest StreamRequest::readParams(const Any& argument) {
    StreamRequest request;
    if (argument.isDict() && argument.asDict().get("stream").isDict())
        request.params = argument.asDict().get("stream").asDict();
    return request;
}

void StreamRequest::complete(const StreamDefaults& defaults) {
    if (codec.empty()) codec = defaults.codec;
    if (settings.empty()) settings = defaults.settings;
    if (!params || params->empty()) params = defaults.params;
}

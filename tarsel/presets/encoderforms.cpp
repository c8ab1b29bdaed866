#include "tarsel/presets/encoderforms.h"

#include <string>

#include "tarsel/presets/outputpreset.h"
#include "tarsel/source/source.h"
#include "tarsel/words/messages.h"
#include "tarsel/words/timespec.h"

namespace {

using namespace QvFourcc;

// Forms that hold all of another one.
constexpr struct {
    unsigned form, holder;
} holders[] = {{W016, Y216}, {v210, Y216}, {UYVY, YUYV}, {I422, YUYV}, {ARGB, BGRA},
               {BGR4, BGRA}, {BGR3, BGR4}, {BGR3, BGRA}, {YV12, I420}};

Any answer(const QvCodec& encoder, const char* name) {
    try {
        return encoder.getParam(name);
    } catch (const QvParamException&) {  // not one of its parameters
        return Any();
    }
}

// 0: none of them.
unsigned formIn(const AnyVector& types, unsigned fourcc) {
    const auto has = [&types](unsigned form) {
        for (const Any& row : types)
            if (row.isDict() && static_cast<unsigned>(row.asDict().getInt32("type", 0)) == form) return true;
        return false;
    };
    if (has(fourcc)) return fourcc;
    for (const Any& row : types) {
        const auto form = static_cast<unsigned>(row.isDict() ? row.asDict().getInt32("type", 0) : 0);
        if (form != 0 && qvEqualFourcc(form, fourcc)) return form;
    }
    for (const auto& row : holders)
        if (row.form == fourcc && has(row.holder)) return row.holder;
    return 0;
}

}  // namespace

void takeForm(QvCodec& encoder, unsigned fourcc, bool asked) {
    const Any types = answer(encoder, "allowedTypes");
    if (isRawEncoder(encoder) || !types.isVector()) return;
    if (!asked && !answer(encoder, "keepsForm").isTrue()) return;
    if (const unsigned form = formIn(types.asVector(), fourcc))
        return setChecked(encoder, "type", static_cast<int>(form), "--pixel");
    if (!asked) return;
    std::string names;
    for (const Any& row : types.asVector())
        names += std::string(names.empty() ? "" : ", ") + row.asDict().getString("name", "");
    throw failure(Msg::presetRange, {"--pixel " + fourccText(fourcc),
                                     std::string("the encoder '") + encoder.name() + "'", names});
}

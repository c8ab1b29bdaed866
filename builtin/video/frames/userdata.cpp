#include "builtin/video/frames/userdata.h"

#include "builtin/creators.h"
#include "core/measure/qvgeometry.h"

namespace {

using Settings = UserDataSettings;

// A Generic that owns bytes is no pointer to anything of the application's.
template <void* Settings::*member>
int setPointer(Settings& settings, const Any& value) {
    const bool borrowed = value.isGeneric() && value.size() == 0;
    if (!borrowed && value.isValid()) return QvStatus::invalidParam;
    settings.*member = borrowed ? value.asGeneric() : nullptr;
    return QvStatus::ok;
}

template <void* Settings::*member>
void getPointer(const Settings& settings, Any& value) {
    value = Any(static_cast<const void*>(settings.*member));
}

template <void* Settings::*member>
constexpr QvParamAccess<Settings> pointerTo{setPointer<member>, getPointer<member>};

void always(const Settings&, Any& value) { value = 1; }

constexpr QvParamRow<Settings> rows[] = {
    {.name = "context",
     .member = pointerTo<&Settings::context>,
     .flags = qvParamStored,
     .help = "passed to the callback",
     .type = Any::Generic},
    {.name = "callback",
     .member = pointerTo<&Settings::callback>,
     .flags = qvParamStored,
     .help = "a QvUserDataCallback, called with each frame",
     .type = Any::Generic},
    {.name = "takesUserData",
     .member = QvParamAccess<Settings>{nullptr, always},
     .flags = qvParamReadOnly,
     .help = "sources are to read their user data",
     .type = Any::Int32},
};
static_assert(qvParamTableOk<Settings>(rows));

}  // namespace

QvCodec* newUserdata() { return new UserData; }

UserData::UserData() : InPlaceEffectOf("userdata", rows) {}

int UserData::change(const QvFrame& from, QvFrame& to) {
    copySamples(to, from);
    if (settings_.callback) reinterpret_cast<QvUserDataCallback>(settings_.callback)(settings_.context, to);
    return QvStatus::ok;
}

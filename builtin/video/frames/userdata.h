// The user data callback filter (module "userdata"): shows each frame that passes to a function of the
// application, which reads or sets its user data, looks at the picture or draws on it.
//
// Parameters, each a pointer that an Any borrows, and stored as such (a file keeps no pointers: a state from
// one has null). Anything else, bytes that an Any owns too, is refused:
//
//     "callback"  the function, a QvUserDataCallback; null: frames just pass
//     "context"   what it is called with, not looked at here
//
// The function is called once for each frame, in order, on the thread that drives the chain. It may change
// samples and metadata of the frame, whose format and size stay; it must not throw. Works in place.
#pragma once

#include "builtin/video/inplaceeffect.h"
#include "core/filter/userdatacallback.h"

struct UserDataSettings {
    void* context = nullptr;
    void* callback = nullptr;
};

class UserData : public InPlaceEffectOf<UserDataSettings> {
  public:
    UserData();

  protected:
    int change(const QvFrame& from, QvFrame& to) override;
};

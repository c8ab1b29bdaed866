// The module class of everything built in: a row of the table in builtin.cpp brought to life.
#pragma once

#include "core/engine/modules/qvmodule.h"

// Further attributes of a module. Lists are words between blanks.
struct QvBuiltinAttributes {
    const char* exts = nullptr;      // extensions of a decoder; "" is an empty list, null no attribute
    int priority = 0;                // of a decoder, the smallest is tried first; 0: no attribute
    bool skipAuto = false;           // never chosen by extension
    bool internal = false;           // not offered to users
    int preroll = 0;                 // frames in front that a filter's frame depends on; 0: no attribute
    const char* inFourcc = nullptr;  // formats that a video encoder takes, stored as FOURCC numbers
};

struct QvBuiltinRow {
    const char* name;
    int type;  // QvModuleType
    const char* desc;
    const char* displayName;
    QvCodec* (*create)();  // a new codec without a module; null: this build has none
    QvBuiltinAttributes attributes = {};
};

class QvBuiltinModule : public QvModule {
  public:
    explicit QvBuiltinModule(const QvBuiltinRow& row);  // the row outlives the module
    QvCodec* create() override;                         // null if this build has no such codec

  private:
    const QvBuiltinRow& row_;
};

// The row of a name, also of modules that are not registered. Asserts if the table has no such row.
const QvBuiltinRow& qvBuiltinRow(const char* name);

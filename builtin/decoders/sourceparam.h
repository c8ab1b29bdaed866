// The row of the parameter "source" in a decoder's table.
#pragma once

#include "core/engine/modules/params.h"
#include "core/stream/qvbytesource.h"

// Of settings with a `QvByteSource* source`.
template <class Settings>
constexpr QvParamRow<Settings> sourceRow = {
    .name = qvSourceParam,
    .member = QvParamAccess<Settings>{[](Settings& settings, const Any& value) {
                                          if (value.isValid() && !qvSourceOf(value))
                                              return QvStatus::invalidParam;
                                          settings.source = qvSourceOf(value);
                                          return QvStatus::ok;
                                      },
                                      nullptr},
    .flags = qvParamWriteOnly,
    .help = "a byte source in the place of the file",
    .type = Any::Generic,
};

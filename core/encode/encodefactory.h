// The maker of encode pipes.
#pragma once

#include "core/arch/api.h"

class AnyDict;
class QvEncodePipe;

class QV_API QvEncFactory {
  public:
    // A new, initialised pipe of module "encpipe", owned by the caller; null without that module. The
    // dictionary is not looked at.
    static QvEncodePipe* encodePipe();
    static QvEncodePipe* encodePipe(const AnyDict& params);
};

// The whole public interface of the engine.
#pragma once

#include "core/arch/api.h"
#include "core/engine/status.h"
#include "core/value/qvassert.h"

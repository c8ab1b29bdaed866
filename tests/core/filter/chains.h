// What the tests of both automatic chains share.
#pragma once

#include <memory>
#include <string>

#include "builtin/modules.h"
#include "core/filter/qvprocesspipe.h"
#include "core/filter/qvprocessutil.h"
#include "core/job/jobdescription.h"
#include "core/measure/qvgeometry.h"
#include "tests/support/checks.h"
#include "tests/support/fake_filters.h"
#include "tests/support/fake_streams.h"

// The stored state of an active filter.
inline AnyDict stored(const char* name, AnyDict state = {}) {
    state.set("name", name);
    state.set("_on", 1);
    return state;
}

// The names of a pipe's filters, each with what `detail` says of it; "none" without a pipe.
template <class Pipe, class Detail>
std::string planOf(const std::unique_ptr<Pipe>& pipe, Detail detail) {
    std::string plan = pipe ? "" : " none";
    for (int i = 0; pipe && i < pipe->nrFilters(); ++i)
        plan += std::string(" ") + pipe->filter(i)->name() + detail(*pipe->filter(i));
    return plan.substr(1);
}

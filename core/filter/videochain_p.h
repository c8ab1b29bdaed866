// The automatic video chain: what a job needs, then the filters in their order.
#pragma once

#include <memory>

class QvVProcessPipe;
struct VideoJobDescription;

namespace qvchain {

// A pipe of this module, open unless `deferOpen`; null when the job needs no processing. Asserts for a name
// without such a module and for a pipe that fails to open.
std::unique_ptr<QvVProcessPipe> createVideoPipe(const VideoJobDescription& job, const char* moduleName,
                                                bool deferOpen);

}  // namespace qvchain

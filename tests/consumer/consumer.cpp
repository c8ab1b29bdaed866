// Starts the engine, says what it finds, and stops it.
#include <cstdio>

#include <qvplugcore/qvplugcore.h>

int main() {
    init_wrapper(nullptr);
    std::printf("%s %d\n", QvUtil::libraryVersion().asString(), qv_registry()->nrModules(0));
    cleanup_wrapper();
    return 0;
}

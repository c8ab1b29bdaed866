// Preloaded into a program, this makes its n-th call of one kind fail.
//
//   SWEEP_KIND   alloc, open, read, write, close or rename
//   SWEEP_N      which call, from 1; 0 for none
//   SWEEP_HOW    eio, enospc, or short (read and write: half of what was asked for, once)
//   SWEEP_EVER   set: all later calls of the kind fail as well
//   SWEEP_TRACE  set: the report has the calls that led to the n-th one
//   SWEEP_REPORT a file: "hit" is written there once the n-th call came
//
// The font configuration library does not survive a failed allocation, and a font that can't be read never
// stops a job: what happens inside that library and with font files does not count.
//
// Only calls from the start of main() count: what the loader does before is not the program's. Reads and
// writes of the standard streams do not count either, nor do those of pipes.
#include <dlfcn.h>
#include <execinfo.h>
#include <fcntl.h>
#include <pthread.h>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <sys/uio.h>
#include <unistd.h>
#include <atomic>
#include <cerrno>
#include <cstdarg>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <new>

namespace {

enum class Kind { none, alloc, open, read, write, close, rename };
enum class How { eio, enospc, partly };

Kind wanted = Kind::none;
How how = How::eio;
long target = 0;
bool ever = false;
bool tracing = false;
int report = -1;
std::atomic<long> count = 0;
std::atomic<bool> running = false;
thread_local int outside = 0;  // inside a library whose calls do not count
bool isFont[4096];             // by descriptor

Kind kindOf(const char* name) {
    static const char* const names[] = {"", "alloc", "open", "read", "write", "close", "rename"};
    for (int i = 1; i < 7; ++i)
        if (name && strcmp(name, names[i]) == 0) return static_cast<Kind>(i);
    return Kind::none;
}

// Where the call comes from, without memory of our own making.
void tell() {
    if (report < 0) return;
    if (syscall(SYS_write, report, "hit\n", 4) < 0) _exit(99);
    if (!tracing) return;
    void* frames[40];
    ++outside;
    backtrace_symbols_fd(frames, backtrace(frames, 40), report);
    --outside;
}

// Whether this call fails.
bool hit(Kind kind) {
    if (kind != wanted || !running.load(std::memory_order_relaxed) || outside) return false;
    const long number = ++count;
    if (number < target || target == 0 || (number > target && !ever)) return false;
    if (number == target) tell();
    errno = kind == Kind::alloc ? ENOMEM : how == How::enospc ? ENOSPC : EIO;
    return true;
}

// The function of this name that would have been called without this library.
#define NEXT(name) static const auto next = reinterpret_cast<decltype(&name)>(dlsym(RTLD_NEXT, #name))

bool isMedia(int fd) {
    struct stat status;
    return fd > 2 && !(fd < static_cast<int>(sizeof isFont) && isFont[fd]) && fstat(fd, &status) == 0 &&
           S_ISREG(status.st_mode);
}

bool begins(const char* path, const char* with) { return strncmp(path, with, strlen(with)) == 0; }

bool isFontPath(const char* path) { return begins(path, "/usr/share/") || begins(path, "/etc/"); }

bool counts(const char* path) {
    return !begins(path, "/proc/") && !begins(path, "/sys/") && !begins(path, "/dev/") && !isFontPath(path);
}

int noted(int fd, const char* path) {
    if (fd >= 0 && fd < static_cast<int>(sizeof isFont)) isFont[fd] = isFontPath(path);
    return fd;
}

mode_t modeOf(va_list& arguments) {
    const mode_t mode = va_arg(arguments, mode_t);
    va_end(arguments);
    return mode;
}

void* allocate(size_t size) {
    if (void* block = malloc(size ? size : 1)) return block;
    throw std::bad_alloc();
}

void* allocateAligned(size_t size, std::align_val_t align) {
    const size_t step = static_cast<size_t>(align);
    return aligned_alloc(step, (size + step - 1) / step * step);
}

void* allocate(size_t size, std::align_val_t align) {
    if (void* block = allocateAligned(size, align)) return block;
    throw std::bad_alloc();
}

}  // namespace

// --- Memory. The operators stand here because a sanitizer's own would not come by.

void* operator new(size_t size) { return allocate(size); }
void* operator new[](size_t size) { return allocate(size); }
void* operator new(size_t size, std::align_val_t align) { return allocate(size, align); }
void* operator new[](size_t size, std::align_val_t align) { return allocate(size, align); }
void* operator new(size_t size, const std::nothrow_t&) noexcept { return malloc(size ? size : 1); }
void* operator new[](size_t size, const std::nothrow_t&) noexcept { return malloc(size ? size : 1); }
void* operator new(size_t size, std::align_val_t align, const std::nothrow_t&) noexcept {
    return allocateAligned(size, align);
}
void* operator new[](size_t size, std::align_val_t align, const std::nothrow_t&) noexcept {
    return allocateAligned(size, align);
}
void operator delete(void* block) noexcept { free(block); }
void operator delete[](void* block) noexcept { free(block); }
void operator delete(void* block, size_t) noexcept { free(block); }
void operator delete[](void* block, size_t) noexcept { free(block); }
void operator delete(void* block, std::align_val_t) noexcept { free(block); }
void operator delete[](void* block, std::align_val_t) noexcept { free(block); }
void operator delete(void* block, size_t, std::align_val_t) noexcept { free(block); }
void operator delete[](void* block, size_t, std::align_val_t) noexcept { free(block); }

extern "C" {

void* malloc(size_t size) {
    NEXT(malloc);
    return hit(Kind::alloc) ? nullptr : next(size);
}
void* calloc(size_t n, size_t size) {
    NEXT(calloc);
    return hit(Kind::alloc) ? nullptr : next(n, size);
}
void* realloc(void* old, size_t size) {
    NEXT(realloc);
    return hit(Kind::alloc) ? nullptr : next(old, size);
}
void* aligned_alloc(size_t align, size_t size) {
    NEXT(aligned_alloc);
    return hit(Kind::alloc) ? nullptr : next(align, size);
}
int posix_memalign(void** out, size_t align, size_t size) {
    NEXT(posix_memalign);
    return hit(Kind::alloc) ? ENOMEM : next(out, align, size);
}

// --- Files

int open(const char* path, int flags, ...) {
    NEXT(open64);
    va_list arguments;
    va_start(arguments, flags);
    const mode_t mode = modeOf(arguments);
    if (counts(path) && hit(Kind::open)) return -1;
    return noted(next(path, flags, mode), path);
}
int open64(const char* path, int flags, ...) {
    va_list arguments;
    va_start(arguments, flags);
    const mode_t mode = modeOf(arguments);
    return open(path, flags, mode);
}
int openat(int folder, const char* path, int flags, ...) {
    NEXT(openat64);
    va_list arguments;
    va_start(arguments, flags);
    const mode_t mode = modeOf(arguments);
    if (counts(path) && hit(Kind::open)) return -1;
    return noted(next(folder, path, flags, mode), path);
}
FILE* fopen64(const char* path, const char* mode) {
    NEXT(fopen64);
    if (counts(path) && hit(Kind::open)) return nullptr;
    FILE* file = next(path, mode);
    if (file) noted(fileno(file), path);
    return file;
}
FILE* fopen(const char* path, const char* mode) { return fopen64(path, mode); }

ssize_t read(int fd, void* to, size_t size) {
    NEXT(read);
    if (!isMedia(fd) || !hit(Kind::read)) return next(fd, to, size);
    return how == How::partly ? next(fd, to, size / 2) : -1;
}
ssize_t pread64(int fd, void* to, size_t size, off64_t at) {
    NEXT(pread64);
    if (!isMedia(fd) || !hit(Kind::read)) return next(fd, to, size, at);
    return how == How::partly ? next(fd, to, size / 2, at) : -1;
}
ssize_t pread(int fd, void* to, size_t size, off_t at) { return pread64(fd, to, size, at); }
ssize_t write(int fd, const void* from, size_t size) {
    NEXT(write);
    if (!isMedia(fd) || !hit(Kind::write)) return next(fd, from, size);
    return how == How::partly ? next(fd, from, size / 2) : -1;
}
ssize_t pwrite64(int fd, const void* from, size_t size, off64_t at) {
    NEXT(pwrite64);
    if (!isMedia(fd) || !hit(Kind::write)) return next(fd, from, size, at);
    return how == How::partly ? next(fd, from, size / 2, at) : -1;
}
ssize_t pwrite(int fd, const void* from, size_t size, off_t at) { return pwrite64(fd, from, size, at); }
ssize_t writev(int fd, const struct iovec* parts, int n) {
    NEXT(writev);
    if (!isMedia(fd) || !hit(Kind::write)) return next(fd, parts, n);
    return how == How::partly ? next(fd, parts, 1) : -1;
}

// The C library's streams write past these symbols, so their calls are failed as a whole. A short one has
// moved half.
size_t fread(void* to, size_t size, size_t n, FILE* file) {
    NEXT(fread);
    if (!isMedia(fileno(file)) || !hit(Kind::read)) return next(to, size, n, file);
    return how == How::partly ? next(to, size, n / 2, file) : 0;
}
size_t fwrite(const void* from, size_t size, size_t n, FILE* file) {
    NEXT(fwrite);
    if (!isMedia(fileno(file)) || !hit(Kind::write)) return next(from, size, n, file);
    return how == How::partly ? next(from, size, n / 2, file) : 0;
}
int fflush(FILE* file) {
    NEXT(fflush);
    if (!file || !isMedia(fileno(file)) || !hit(Kind::write)) return next(file);
    return EOF;
}

// What is closed is gone, also when that fails.
int close(int fd) {
    NEXT(close);
    const bool fails = isMedia(fd) && hit(Kind::close);
    const int saved = errno;
    const int result = next(fd);
    if (!fails) return result;
    errno = saved;
    return -1;
}
int fclose(FILE* file) {
    NEXT(fclose);
    const bool fails = isMedia(fileno(file)) && hit(Kind::close);
    const int saved = errno;
    const int result = next(file);
    if (!fails) return result;
    errno = saved;
    return EOF;
}

int rename(const char* from, const char* to) {
    NEXT(rename);
    return hit(Kind::rename) ? -1 : next(from, to);
}
int renameat2(int a, const char* from, int b, const char* to, unsigned flags) {
    NEXT(renameat2);
    return hit(Kind::rename) ? -1 : next(a, from, b, to, flags);
}

// --- Calls that do not count

#define OUTSIDE(type, name, parameters, ...) \
    type name parameters {                   \
        NEXT(name);                          \
        struct Outside {                     \
            Outside() { ++outside; }         \
            ~Outside() { --outside; }        \
        } const here;                        \
        return next(__VA_ARGS__);            \
    }

OUTSIDE(void*, FcInitLoadConfigAndFonts, (), )
OUTSIDE(void*, FcPatternCreate, (), )
OUTSIDE(int, FcPatternAddBool, (void* a, const char* b, int c), a, b, c)
OUTSIDE(int, FcPatternAddInteger, (void* a, const char* b, int c), a, b, c)
OUTSIDE(int, FcPatternAddString, (void* a, const char* b, const void* c), a, b, c)
OUTSIDE(int, FcConfigSubstitute, (void* a, void* b, int c), a, b, c)
OUTSIDE(void*, FcFontMatch, (void* a, void* b, void* c), a, b, c)
OUTSIDE(void, FcDefaultSubstitute, (void* a), a)

// A sanitizer's, at the start of each thread, which it does not survive failing.
OUTSIDE(int, pthread_getattr_np, (pthread_t a, pthread_attr_t* b), a, b)

// --- Start: main() is wrapped, so that the loader's own calls do not count.

static int (*realMain)(int, char**, char**) = nullptr;

static int countedMain(int argc, char** argv, char** environment) {
    if (const char* file = getenv("SWEEP_REPORT"))
        report = open(file, O_WRONLY | O_CREAT | O_TRUNC | O_CLOEXEC, 0600);
    wanted = kindOf(getenv("SWEEP_KIND"));
    target = getenv("SWEEP_N") ? atol(getenv("SWEEP_N")) : 0;
    ever = getenv("SWEEP_EVER") != nullptr;
    tracing = getenv("SWEEP_TRACE") != nullptr;
    const char* way = getenv("SWEEP_HOW");
    how = way && strcmp(way, "enospc") == 0  ? How::enospc
          : way && strcmp(way, "short") == 0 ? How::partly
                                             : How::eio;
    unsetenv("LD_PRELOAD");  // a command that the program starts is not swept
    running = true;
    return realMain(argc, argv, environment);
}

// What the runtime does at the end of the process is no longer the program's.
__attribute__((destructor)) static void end() { running = false; }

int __libc_start_main(int (*program)(int, char**, char**), int argc, char** argv, void (*init)(),
                      void (*fini)(), void (*linkerFini)(), void* stackEnd) {
    NEXT(__libc_start_main);
    realMain = program;
    return next(countedMain, argc, argv, init, fini, linkerFini, stackEnd);
}

}  // extern "C"

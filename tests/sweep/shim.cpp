// Preloaded into a program, this makes one call of the C library fail: a call of one kind, made from one call
// stack.
//
//   SWEEP_RECORD set: nothing fails; each call is reported as a line "KIND SITE STACK"
//   SWEEP_KIND   alloc, open, read, write, close, rename, sync, thread, make or lock
//   SWEEP_SITE   the place of the call that fails, and
//   SWEEP_STACK  the hash of its call stack, both as a recording run has reported them
//   SWEEP_NTH    which call from there, from 1
//   SWEEP_HOW    eio, enospc, or short (read and write: half of what was asked for, once)
//   SWEEP_EVER   set: all later calls of the kind fail as well
//   SWEEP_TRACE  set: the report has the calls that led to the one that failed
//   SWEEP_REPORT a file: what was recorded, or "hit" once a call has failed
//
// Calls are known by their stack and not by their number, because the numbers change from run to run where
// threads work together. Addresses are relative to their library, so they are the same in each run.
//
// The font configuration library does not survive a failed allocation, and a font that can't be read never
// stops a job: what happens inside that library and with font files does not count. Nor does the C library
// survive one while it unloads the converter of a code page, and while it loads one it leaks.
//
// Only calls from the start of main() count: what the loader does before is not the program's. Reads and
// writes of the standard streams do not count either, nor do those of pipes.
#include <dlfcn.h>
#include <execinfo.h>
#include <fcntl.h>
#include <link.h>
#include <pthread.h>
#include <sys/file.h>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <sys/uio.h>
#include <unistd.h>
#include <unwind.h>
#include <atomic>
#include <cerrno>
#include <cstdarg>
#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <iterator>
#include <new>

namespace {

enum class Kind { none, alloc, open, read, write, close, rename, sync, thread, make, lock };
enum class How { eio, enospc, partly };

constexpr const char* kKinds[] = {"",       "alloc", "open",   "read", "write", "close",
                                  "rename", "sync",  "thread", "make", "lock"};

Kind wanted = Kind::none;
How how = How::eio;
uint64_t wantedSite = 0, wantedStack = 0;
long nth = 1;
bool ever = false;
bool tracing = false;
bool recording = false;
int report = -1;
std::atomic<long> count = 0;
std::atomic<bool> reached = false;
std::atomic<bool> running = false;
thread_local int outside = 0;  // inside a library whose calls do not count
bool isFont[4096];             // by descriptor

Kind kindOf(const char* name) {
    for (int i = 1; name && i < static_cast<int>(std::size(kKinds)); ++i)
        if (strcmp(name, kKinds[i]) == 0) return static_cast<Kind>(i);
    return Kind::none;
}

void writeReport(const char* text, size_t size) {
    if (report >= 0 && syscall(SYS_write, report, text, size) < 0) _exit(99);
}

uint64_t inLibrary(const void* address) {
    dl_find_object found;
    const auto value = reinterpret_cast<uint64_t>(address);
    if (_dl_find_object(const_cast<void*>(address), &found) != 0) return value;
    return value - found.dlfo_link_map->l_addr;
}

// Calls are the same if so many frames are, from the innermost one on. With whole stacks the sweep takes a
// half longer, and what it adds differs in the command alone; the sample of later calls has some of these.
constexpr int kFrames = 12;

struct Walk {
    const void* from;  // the caller's address, where the stack of the program begins
    uint64_t hash;
    int depth;
};

_Unwind_Reason_Code step(_Unwind_Context* context, void* argument) {
    Walk& walk = *static_cast<Walk*>(argument);
    const void* here = reinterpret_cast<const void*>(_Unwind_GetIP(context));
    if (walk.depth == 0 && here != walk.from) return _URC_NO_REASON;
    walk.hash = (walk.hash ^ inLibrary(here)) * 0x100000001b3;
    return ++walk.depth < kFrames ? _URC_NO_REASON : _URC_END_OF_STACK;
}

uint64_t stackHash(const void* caller) {
    Walk walk{caller, 0xcbf29ce484222325, 0};
    ++outside;
    _Unwind_Backtrace(step, &walk);
    --outside;
    return walk.hash;
}

// Where the call comes from, without memory of our own making.
void tell() {
    writeReport("hit\n", 4);
    if (!tracing || report < 0) return;
    void* frames[40];
    ++outside;
    backtrace_symbols_fd(frames, backtrace(frames, 40), report);
    --outside;
}

void recordCall(Kind kind, const void* caller) {
    const int saved = errno;
    char line[80];
    const int size = snprintf(line, sizeof line, "%s %lx %lx\n", kKinds[static_cast<int>(kind)],
                              inLibrary(caller), stackHash(caller));
    writeReport(line, static_cast<size_t>(size));
    errno = saved;
}

// Whether this call, which returns to `caller`, fails.
bool hit(Kind kind, const void* caller) {
    if (!running.load(std::memory_order_relaxed) || outside) return false;
    if (recording) {
        recordCall(kind, caller);
        return false;
    }
    if (kind != wanted) return false;
    if (reached) {
        if (!ever) return false;
    } else {
        if (inLibrary(caller) != wantedSite || stackHash(caller) != wantedStack || ++count != nth)
            return false;
        reached = true;
        tell();
    }
    errno = kind == Kind::alloc    ? ENOMEM
            : kind == Kind::thread ? EAGAIN
            : kind == Kind::lock   ? ENOLCK
            : how == How::enospc   ? ENOSPC
                                   : EIO;
    return true;
}

#define HIT(kind) hit(Kind::kind, __builtin_return_address(0))

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

// As the operators do, those that answer with null included.
void* refused() {
    try {
        if (const std::new_handler handler = std::get_new_handler()) handler();
    } catch (const std::bad_alloc&) {
    }
    return nullptr;
}

void* take(size_t size, const void* caller) {
    NEXT(malloc);
    return hit(Kind::alloc, caller) ? refused() : next(size ? size : 1);
}

void* takeAligned(size_t size, std::align_val_t align, const void* caller) {
    NEXT(aligned_alloc);
    const size_t step = static_cast<size_t>(align);
    return hit(Kind::alloc, caller) ? refused() : next(step, (size + step - 1) / step * step);
}

void* orThrow(void* block) {
    if (block) return block;
    throw std::bad_alloc();
}

}  // namespace

// --- Memory. The operators stand here because a sanitizer's own would not come by.

#define CALLER __builtin_return_address(0)

void* operator new(size_t size) { return orThrow(take(size, CALLER)); }
void* operator new[](size_t size) { return orThrow(take(size, CALLER)); }
void* operator new(size_t size, std::align_val_t align) { return orThrow(takeAligned(size, align, CALLER)); }
void* operator new[](size_t size, std::align_val_t align) {
    return orThrow(takeAligned(size, align, CALLER));
}
void* operator new(size_t size, const std::nothrow_t&) noexcept { return take(size, CALLER); }
void* operator new[](size_t size, const std::nothrow_t&) noexcept { return take(size, CALLER); }
void* operator new(size_t size, std::align_val_t align, const std::nothrow_t&) noexcept {
    return takeAligned(size, align, CALLER);
}
void* operator new[](size_t size, std::align_val_t align, const std::nothrow_t&) noexcept {
    return takeAligned(size, align, CALLER);
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
    return HIT(alloc) ? nullptr : next(size);
}
void* calloc(size_t n, size_t size) {
    NEXT(calloc);
    return HIT(alloc) ? nullptr : next(n, size);
}
void* realloc(void* old, size_t size) {
    NEXT(realloc);
    return HIT(alloc) ? nullptr : next(old, size);
}
void* aligned_alloc(size_t align, size_t size) {
    NEXT(aligned_alloc);
    return HIT(alloc) ? nullptr : next(align, size);
}
int posix_memalign(void** out, size_t align, size_t size) {
    NEXT(posix_memalign);
    return HIT(alloc) ? ENOMEM : next(out, align, size);
}

// --- Files

int open(const char* path, int flags, ...) {
    NEXT(open64);
    va_list arguments;
    va_start(arguments, flags);
    const mode_t mode = modeOf(arguments);
    if (counts(path) && HIT(open)) return -1;
    return noted(next(path, flags, mode), path);
}
int open64(const char* path, int flags, ...) {
    NEXT(open64);
    va_list arguments;
    va_start(arguments, flags);
    const mode_t mode = modeOf(arguments);
    if (counts(path) && HIT(open)) return -1;
    return noted(next(path, flags, mode), path);
}
int openat(int folder, const char* path, int flags, ...) {
    NEXT(openat64);
    va_list arguments;
    va_start(arguments, flags);
    const mode_t mode = modeOf(arguments);
    if (counts(path) && HIT(open)) return -1;
    return noted(next(folder, path, flags, mode), path);
}
FILE* fopen64(const char* path, const char* mode) {
    NEXT(fopen64);
    if (counts(path) && HIT(open)) return nullptr;
    FILE* file = next(path, mode);
    if (file) noted(fileno(file), path);
    return file;
}
FILE* fopen(const char* path, const char* mode) {
    NEXT(fopen64);
    if (counts(path) && HIT(open)) return nullptr;
    FILE* file = next(path, mode);
    if (file) noted(fileno(file), path);
    return file;
}

ssize_t read(int fd, void* to, size_t size) {
    NEXT(read);
    if (!isMedia(fd) || !HIT(read)) return next(fd, to, size);
    return how == How::partly ? next(fd, to, size / 2) : -1;
}
ssize_t pread64(int fd, void* to, size_t size, off64_t at) {
    NEXT(pread64);
    if (!isMedia(fd) || !HIT(read)) return next(fd, to, size, at);
    return how == How::partly ? next(fd, to, size / 2, at) : -1;
}
ssize_t pread(int fd, void* to, size_t size, off_t at) { return pread64(fd, to, size, at); }
ssize_t write(int fd, const void* from, size_t size) {
    NEXT(write);
    if (!isMedia(fd) || !HIT(write)) return next(fd, from, size);
    return how == How::partly ? next(fd, from, size / 2) : -1;
}
ssize_t pwrite64(int fd, const void* from, size_t size, off64_t at) {
    NEXT(pwrite64);
    if (!isMedia(fd) || !HIT(write)) return next(fd, from, size, at);
    return how == How::partly ? next(fd, from, size / 2, at) : -1;
}
ssize_t pwrite(int fd, const void* from, size_t size, off_t at) { return pwrite64(fd, from, size, at); }
ssize_t writev(int fd, const struct iovec* parts, int n) {
    NEXT(writev);
    if (!isMedia(fd) || !HIT(write)) return next(fd, parts, n);
    return how == How::partly ? next(fd, parts, 1) : -1;
}

// The C library's streams write past these symbols, so their calls are failed as a whole. A short one has
// moved half.
size_t fread(void* to, size_t size, size_t n, FILE* file) {
    NEXT(fread);
    if (!isMedia(fileno(file)) || !HIT(read)) return next(to, size, n, file);
    return how == How::partly ? next(to, size, n / 2, file) : 0;
}
size_t fwrite(const void* from, size_t size, size_t n, FILE* file) {
    NEXT(fwrite);
    if (!isMedia(fileno(file)) || !HIT(write)) return next(from, size, n, file);
    return how == How::partly ? next(from, size, n / 2, file) : 0;
}
int fflush(FILE* file) {
    NEXT(fflush);
    if (!file || !isMedia(fileno(file)) || !HIT(write)) return next(file);
    return EOF;
}

// What is closed is gone, also when that fails.
int close(int fd) {
    NEXT(close);
    const bool fails = isMedia(fd) && HIT(close);
    const int saved = errno;
    const int result = next(fd);
    if (!fails) return result;
    errno = saved;
    return -1;
}
int fclose(FILE* file) {
    NEXT(fclose);
    const bool fails = isMedia(fileno(file)) && HIT(close);
    const int saved = errno;
    const int result = next(file);
    if (!fails) return result;
    errno = saved;
    return EOF;
}

#define FAILS(kind, type, name, parameters, ...) \
    type name parameters {                       \
        NEXT(name);                              \
        if (HIT(kind)) return -1;                \
        return next(__VA_ARGS__);                \
    }

FAILS(rename, int, rename, (const char* from, const char* to), from, to)
FAILS(rename, int, renameat, (int a, const char* from, int b, const char* to), a, from, b, to)
FAILS(rename, int, renameat2, (int a, const char* from, int b, const char* to, unsigned flags), a, from, b,
      to, flags)
FAILS(rename, int, link, (const char* from, const char* to), from, to)
FAILS(rename, int, linkat, (int a, const char* from, int b, const char* to, int flags), a, from, b, to, flags)
FAILS(sync, int, fsync, (int fd), fd)
FAILS(sync, int, fdatasync, (int fd), fd)
FAILS(sync, int, syncfs, (int fd), fd)
FAILS(lock, int, flock, (int fd, int operation), fd, operation)
FAILS(make, int, mkdir, (const char* path, mode_t mode), path, mode)
FAILS(make, int, mkdirat, (int folder, const char* path, mode_t mode), folder, path, mode)
FAILS(make, int, symlink, (const char* to, const char* path), to, path)
FAILS(write, int, ftruncate, (int fd, off_t size), fd, size)
FAILS(write, int, ftruncate64, (int fd, off64_t size), fd, size)
FAILS(write, int, fallocate, (int fd, int mode, off_t at, off_t size), fd, mode, at, size)

char* mkdtemp(char* pattern) {
    NEXT(mkdtemp);
    return HIT(make) ? nullptr : next(pattern);
}
int pthread_create(pthread_t* thread, const pthread_attr_t* attributes, void* (*start)(void*),
                   void* argument) {
    NEXT(pthread_create);
    return HIT(thread) ? EAGAIN : next(thread, attributes, start, argument);
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
OUTSIDE(void*, iconv_open, (const char* a, const char* b), a, b)
OUTSIDE(int, iconv_close, (void* a), a)
// Constructors of the codec libraries end the program where they have no memory.
OUTSIDE(void*, dlopen, (const char* a, int b), a, b)

// A sanitizer's, at the start of each thread, which it does not survive failing.
OUTSIDE(int, pthread_getattr_np, (pthread_t a, pthread_attr_t* b), a, b)

// --- Start: main() is wrapped, so that the loader's own calls do not count.

static int (*realMain)(int, char**, char**) = nullptr;

static int countedMain(int argc, char** argv, char** environment) {
    if (const char* file = getenv("SWEEP_REPORT"))
        report = open(file, O_WRONLY | O_CREAT | O_TRUNC | O_CLOEXEC, 0600);
    wanted = kindOf(getenv("SWEEP_KIND"));
    recording = getenv("SWEEP_RECORD") != nullptr;
    if (const char* site = getenv("SWEEP_SITE")) wantedSite = strtoull(site, nullptr, 16);
    if (const char* stack = getenv("SWEEP_STACK")) wantedStack = strtoull(stack, nullptr, 16);
    if (const char* which = getenv("SWEEP_NTH")) nth = atol(which);
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

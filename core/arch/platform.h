// The platform contract: all that the engine asks of the operating system, in one substitutable class.
//
// QvPlatform's own bodies are the real system's (core/arch/posix). A test derives from it, overrides the
// operation that is to fail (a disk that fills up, a thread that does not start) and installs the object
// with qv_set_platform; see tests/support/platform_scope.h.
//
// Names are byte strings: what the file system holds, UTF-8 by custom but not by force. Wide names become
// bytes before they come here, see core/arch/widename.h. A name that is empty is never found.
//
// Unless said otherwise `int` results are 0 for success and -1 for failure, nothing throws but bad_alloc,
// and every operation may be called from any thread.
#pragma once

#include <cstddef>
#include <cstdint>
#include <cstdio>
#include <ctime>
#include <functional>
#include <memory>
#include <string>
#include <string_view>
#include <thread>
#include <vector>

#include "core/arch/api.h"

struct QvFileStatus {
    bool isFolder = false;
    bool isRegular = false;    // neither folder nor device, pipe or socket
    long long size = 0;        // bytes; of a regular file
    long long modifiedNs = 0;  // nanoseconds since 1970-01-01 00:00 UTC
};

struct QvFolderEntry {
    std::string name;       // without the folder
    bool isFolder = false;  // also true of a symbolic link to a folder
};

// Who may own the file of a library, and who may write it.
enum class QvLibraryTrust {
    // Root and this user (the effective one) own the file, each folder on the way to it and each link, and
    // nobody else may write to them: not everybody, nor a group, except the user's private one and root's.
    // Folders above that of the file may be open to all if they protect what is in them (the sticky bit, as
    // /tmp has it).
    owner,
    anyone,
};

enum class QvLibraryFault {
    none,
    unreadable,    // not there, or may not be read
    unsafe,        // in the hands of others
    invalid,       // not a whole shared library of this machine
    unresolved,    // the loader refuses it: a library that it needs is not there
    unsafeFolder,  // a folder that leads to it is in the hands of others
    foreign,       // its libraries are there, but lack a function, a variable or a version that it needs
};

struct QvLibrary {
    void* handle = nullptr;
    QvLibraryFault fault = QvLibraryFault::none;
    std::string reason;  // the end of a sentence that begins with the file: "is empty"
};

class QvCancel;

enum class QvFontFace { sans, sansItalic, sansBold, monospaceBold };

struct QvFontFile {
    std::string name;
    int face = 0;  // which one of those that the file holds
};

class QV_API QvPlatform {
  public:
    virtual ~QvPlatform();

    // --- Files -----------------------------------------------------------------------------------------

    // A stream of the C library, or null. Modes are fopen's: "r", "w", "a", each with "+" and "b". Folders
    // are refused, and child processes do not inherit the file. The caller reads, writes and closes it with
    // the C library; a substitute that wants these to fail returns a stream of its own making.
    virtual std::FILE* openFile(const char* name, const char* mode);
    // openFile for writing ("wb") of what may be no file. A pipe, a socket, a terminal, a device and what is
    // named by one of this process's own descriptors ("/dev/stdout", "/dev/fd/3") is a stream, and sets
    // `isStream`: writing starts at its current position, it can't be sought, and a wait for its reader ends
    // with ECANCELED after a request of `cancel` (null: never). Inherited descriptors keep their flags.
    virtual std::FILE* openOutput(const char* name, const std::shared_ptr<QvCancel>& cancel, bool& isStream);
    // A file descriptor of the C runtime for libraries that take nothing else, or -1. Writing creates or
    // truncates. The library that takes it closes it; closeDescriptor is for one that was not taken.
    virtual int openDescriptor(const char* name, bool writing);
    virtual void closeDescriptor(int descriptor);
    // Positions of 64 bits; `origin` is SEEK_SET, SEEK_CUR or SEEK_END. tell gives -1 on failure.
    virtual int seek(std::FILE* file, long long offset, int origin);
    virtual long long tell(std::FILE* file);
    // Brings what was written to the disc.
    virtual int sync(std::FILE* file);

    // Follows symbolic links. False, with `status` untouched, if there is nothing of this name.
    virtual bool status(const char* name, QvFileStatus& status);
    // True if both names lead to one existing file, whatever links lie between.
    virtual bool sameFile(const char* first, const char* second);
    virtual int removeFile(const char* name);
    virtual int removeFolder(const char* name);  // an empty one
    // Success too if the folder is there already, made by another process in between.
    virtual int makeFolder(const char* name);
    // Renames; where the two lie on different discs copies a file and removes it, and refuses a folder. The
    // target never shows half a file. An existing target is replaced in one step with `replace`, and is a
    // failure without.
    virtual int moveFile(const char* from, const char* to, bool replace);
    // Appends all entries, "." and ".." included, in byte order of their names. Does not touch the
    // process's current folder.
    virtual int listFolder(const char* folder, std::vector<QvFolderEntry>& entries);
    // Removes a folder with all it holds. A symbolic link in it is removed and never followed, and a `folder`
    // that is itself a link is refused. Entries for which `keep` is true stay, which makes the result -1.
    virtual int removeTree(const char* folder, bool (*keep)(std::string_view entry));
    // Bytes that this user may still write to the disc of `name`; if `name` does not exist, of the nearest
    // folder above it that does. -1 if that can't be found out.
    virtual long long freeSpace(const char* name);
    virtual std::string currentFolder();  // empty on failure

    // --- Environment -----------------------------------------------------------------------------------

    // False if the variable is not set.
    virtual bool environment(const char* name, std::string& value);
    virtual std::string homeFolder();  // of the user; without a separator at the end
    virtual std::string tempFolder();  // likewise
    virtual bool isTerminal(std::FILE* stream);
    virtual void debugOutput(const char* text);  // unchanged, no newline is added

    // --- Libraries and processes -----------------------------------------------------------------------

    // A library with its dependencies, which are also looked for in its own folder, by their sonames. The
    // file, and dependencies from its folder, are checked before any of their code runs; a name that leads to
    // a pipe or a device does not block. Symbols stay local to the library. The start of a library runs in
    // this call and may end the process, also by an exception: none passes the system's loader.
    virtual QvLibrary loadLibrary(const char* name, QvLibraryTrust trust);
    // The value of an exported 32-bit number as the file has it, without loading the library. False if it
    // can't be found there.
    virtual bool libraryNumber(const char* name, const char* symbol, std::uint32_t& value);
    virtual void* findSymbol(void* library, const char* symbol);  // null if absent
    virtual void unloadLibrary(void* library);
    virtual std::string coreLibraryPath();  // full name of the file that holds the engine
    // Gives `command` to the shell and waits for its end without limit. The result is the exit code, 128 plus
    // the signal's number if a signal ended it, or -1 if it can't be started or its end can't be learned. The
    // command reads nothing from this process's standard input.
    virtual int runCommand(const char* command);

    // --- Threads and time ------------------------------------------------------------------------------

    // A running thread, or one that is not joinable() if the system has no more. `body` must not throw.
    virtual std::thread startThread(std::function<void()> body);
    // Makes the calling thread yield to interactive work. The result goes to restoreThreadPriority on the
    // same thread.
    virtual int lowerThreadPriority();
    virtual void restoreThreadPriority(int former);
    virtual void sleep(int milliseconds);
    virtual int processors();  // that this process may use, at least 1

    virtual long long steadyNs();  // never goes back; the origin is arbitrary
    virtual long long systemNs();  // since 1970-01-01 00:00 UTC
    // The calendar form of seconds since 1970 in the user's time zone. False if it has none.
    virtual bool localTime(long long seconds, std::tm& calendar);

    // --- Memory ----------------------------------------------------------------------------------------

    // For blocks of the size of a picture or a stream buffer, whose absence is an expected failure: null if
    // there is not enough. `alignment` is a power of two. release takes null.
    virtual void* allocate(std::size_t bytes, std::size_t alignment);
    virtual void release(void* block);

    // --- Text, fonts and facts -------------------------------------------------------------------------

    virtual bool hasCodepage(int number);
    // Appends the code points of `bytes`, read in a code page, to `text`. What is not valid in it becomes
    // U+FFFD, a byte each. False if the system does not know the code page.
    virtual bool decodeCodepage(int number, std::string_view bytes, std::u32string& text);
    // Full name, empty if the system has no font at all. The fonts are looked for once, by the first call
    // that finds some, and again when the file is gone. fontconfig ends the process where it gets no memory:
    // std::bad_alloc if there are not 8 MB for it.
    virtual std::string fontFile(QvFontFace face);
    // Fonts that together have as many of the letters as the system's fonts can draw, nearest to `like`
    // first.
    virtual std::vector<QvFontFile> fontsWith(std::u32string_view letters, QvFontFace like);
    // The font of an installed family, or of one that the system takes in its place, with the weight and the
    // slant of `like`. The name is empty if there is none.
    virtual QvFontFile fontOf(const std::string& family, QvFontFace like);
    virtual std::vector<std::string> fontFamilies();  // sorted
    virtual std::string cpuFeatures();                // "MMX SSE2 ...", in a fixed order
    virtual std::string platformName();               // "Linux x64"
    virtual std::uint32_t randomBits();               // from the system's entropy: two processes do not meet

    // `name` as one word of a shell command: no character in it can act, and no leading "-" makes an option
    // of it.
    virtual std::string quoteForShell(std::string_view name);
};

// The platform in force: the system's own unless a test has put another in its place.
QV_API QvPlatform& qv_platform();

// Puts `substitute` in force, null the system's own, and returns what was in force before (null for the
// system's own). The caller keeps it alive while it is in force and any stream or thread of it is in use.
QV_API QvPlatform* qv_set_platform(QvPlatform* substitute);

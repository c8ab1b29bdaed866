// File names and file operations on Any values.
//
// A name is a String (bytes) or a WString (16-bit units); results have the width of the argument unless said
// otherwise. Text operations take both "/" and "\\" as separators on every platform. How wide names and bytes
// correspond is described in core/arch/widename.h.
//
// Operations that fail return -1, null or an invalid Any and don't throw; an argument that is no text is
// misuse and asserts where the operation says so, else it counts as a failure.
#pragma once

#include <string>

#include "core/arch/api.h"
#include "core/value/any.h"
#include "core/value/anycontainer.h"

class QvDateTime;

// A stream of the C library (std::FILE*), or null after a line in the debug log. The caller closes it with
// fclose. The mode is fopen's; with a wide name at most its first four characters count. Folders don't open.
QV_API void* qvfopen(const Any& name, const char* mode);

QV_API const char* path_separator();
QV_API Any core_library_path();

// Replaces `out` by the full name, folder + "/" + name, of each plug-in file of a folder, in byte order.
QV_API void get_folder_plugin_dlls(const Any& folder, AnyVector* out);
// The same for every entry, folders included, that matches "*" + `ext`: "*" and "?" in it stand for any
// characters and any one, letters match in their own case, and an empty or null `ext` takes every entry, "."
// and ".." too. No folder and no match are lines in the debug log. The process's current folder stays.
QV_API void get_folder_files_by_ext(const Any& folder, const char* ext, AnyVector* out);

// Gives a command line to the shell, waits for its end without limit and returns its exit code; 128 plus the
// signal's number if a signal ended it; -1 if it can't be started. The command finds nothing to read on its
// standard input.
QV_API int execute_process(const Any& commandLine);
QV_API void debug_trace(const char* text);                      // to the debugger output
QV_API void debug_trace1(const char* first, const char* text);  // "first text\n"

class QV_API QvFile {
  public:
    // --- Names: text only, the disc is not asked

    static Any getPath(const Any& name);      // "a/b.c" -> "a/";  "c:x" -> "c:/";  "x" -> ""
    static Any getFilename(const Any& name);  // "a/b.c" -> "b.c";  "c:x" -> "x"
    static Any getBasename(const Any& name);  // "a/b.c.d" -> "b.c"
    // Without the dot; empty if there is none or nothing follows. With `lower` narrow and lower-cased
    // (ASCII).
    static Any getExt(const Any& name, bool lower);
    static Any stripExt(const Any& name);                   // "a/b.c" -> "a/b"
    static Any joinExt(const Any& name, const Any& ext);    // "a", "b" -> "a.b";  "a.", "b" -> "a.b"
    static Any changeExt(const Any& name, const Any& ext);  // "a/b.c", "d" -> "a/b.d"
    static Any joinPath(const Any& first, const Any& second);
    // Joins with the first separator that appears in any part, else the platform's, and turns all others into
    // it. Empty parts and parts that are no text are skipped; a leading separator of the first is kept. Wide
    // if any part is.
    static Any joinPath(const AnyVector& parts);
    static bool isAbsolutePath(const Any& name);  // "/a", "\\a", "c:a"
    // The platform's separators throughout, at most 1,023 characters.
    static void winFname(const Any& in, Any& out);
    static Any osFname(const Any& in);
    // Turns the other kind of separator into `separator`, in place. True if anything changed.
    static bool setSeparator(Any& name, char separator);
    // A backslash before each of |&;<>()$`\"' blank tab. For text that a user reads or pastes; a command line
    // of the engine's own takes shellQuote.
    static Any shellEscape(const Any& text);
    // A name as one word of a command line for execute_process, whatever characters it holds: none of them
    // can act there, and a leading "-" makes no option. Invalid if it is no text.
    static Any shellQuote(const Any& name);

    // --- Places

    static Any homeDir();  // no separator at the end
    static Any tempDir();  // with a separator at the end

    // --- Files

    static bool isFile(const Any& name);  // exists and is no folder
    static bool isDir(const Any& name);
    static long long flength(const Any& name);        // bytes, -1 if it can't be opened
    static long long flength(void* stream);           // keeps the position; -1 on failure
    static QvDateTime lastModified(const Any& name);  // local time; all fields 0 on failure
    static void* fopen(const Any& name, const char* mode) { return qvfopen(name, mode); }
    static int fseek64(void* stream, long long offset, int origin);  // 0 or -1
    static long long ftell64(void* stream);                          // -1 on failure
    static int rm(const Any& name);
    static int mkdir(const Any& name);
    static int mkpath(const Any& name);  // with all parents; 0 if it is there already
    // Removes the entries that `ls` lists, with all below them, and then the folder. Symbolic links are
    // removed, never followed. -1 if anything is left, as entries that `ls` leaves out are.
    static int rmdir(const Any& name);
    // With `overwrite` an existing file gives way; a folder never does. Works between discs.
    static int mv(const Any& from, const Any& to, bool overwrite);
    // True if both names lead to the same existing file.
    static bool isSameFile(const Any& first, const Any& second);
    static long long freeSpace(const Any& name);  // bytes on the disc of `name`, -1 if unknown

    // --- Listings

    // Full names. Left out are "." and "..", names that begin with their only dot (".x"), and with bit 0 of
    // `filesOnly` folders.
    static AnyVector ls(const Any& folder, int filesOnly);
    // The numbers, ascending, of the image sequence that `name` is a member of: files of its folder with its
    // extension, the length of its base name and its text before the last digits. `digits` (may be null)
    // receives the count of digits. Empty if there are no digits, or, with `digits` 0, no other member.
    static AnyVector numberedSequence(const Any& name, int* digits);

    // --- gzip files

    // 0 if all `size` bytes went to the disc.
    static int compress(const Any& name, const unsigned char* data, int size);
    // The contents as a Generic with its size, invalid if there are none. -1, with `out` invalid, if the file
    // can't be read, is no gzip file, is damaged, ends early, or holds more than 2,147,483,647 bytes.
    static int decompress(const Any& name, Any& out);
};

// A name as the platform contract takes it, UTF-8 for wide ones; empty for what is no text.
QV_API std::string qv_os_name(const Any& name);
// Bytes of the platform as a name of the width that `like` has.
QV_API Any qv_any_name(const std::string& bytes, const Any& like);

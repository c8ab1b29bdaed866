#include "tarsel/words/systemcause.h"

#include <cerrno>
#include <cstring>

#include "tarsel/words/failure.h"

namespace {

struct Row {
    int error;
    const char *why, *remedy;
};

// clang-format off
constexpr Row kRows[] = {
    {ENOENT,       "no such file or folder",                                     "check the name"},
    {ENOTDIR,      "a part of the name is no folder",                            "check the name"},
    {EISDIR,       "this is a folder",                                           "give the name of a file"},
    {EEXIST,       "it exists",                                                  "give another name"},
    {ENAMETOOLONG, "the name is too long",                                       "give a shorter one"},
    {ELOOP,        "its links lead in a circle",                                 "check the links"},
    {EACCES,       "permission denied",                                          "change the permissions, or choose another place"},
    {EPERM,        "the system does not permit it",                              "choose another place"},
    {EROFS,        "the disk is read-only",                                      "choose another disk"},
    {ENOSPC,       "the disk is full",                                           "free some space, or choose another disk"},
    {EDQUOT,       "your share of the disk is used up",                          "free some space, or choose another disk"},
    {EFBIG,        "the file is larger than the disk or a limit of the system allows", "choose another disk, or raise the limit (ulimit -f)"},
    {EIO,          "the disk reports a failure",                                 "check the disk"},
    {ESTALE,       "its network folder has gone",                                "mount it again"},
    {EMFILE,       "too many files are open",                                    "raise the limit (ulimit -n)"},
    {ENFILE,       "too many files are open",                                    "end other programs"},
    {ENOMEM,       "there is not enough memory",                                 "end other programs"},
    {EPIPE,        "its reader has gone",                                        "see why the reader ended"},
    {EBUSY,        "something else uses it",                                     "try again later"},
    {ETXTBSY,      "it is a program that runs",                                  "give another name"},
    {ENXIO,        "nothing reads from it",                                      "start its reader first"},
    {EBADF,        "it is closed",                                               "open it"},
};
// clang-format on

}  // namespace

SystemCause causeOf(int error) {
    for (const Row& row : kRows)
        if (row.error == error) return {row.why, row.remedy};
    return {inLine(std::strerror(error)), "check the name and the disk"};
}

std::optional<SystemCause> causeIn(std::string_view sentence) {
    while (!sentence.empty() && (sentence.back() == '.' || sentence.back() == '\n'))
        sentence.remove_suffix(1);
    for (const Row& row : kRows)
        if (sentence.ends_with(std::string(": ") + std::strerror(row.error)))
            return SystemCause{row.why, row.remedy};
    return std::nullopt;
}

// Runs a program and kills it right before its N-th system call that can change a file or a folder:
//
//   killat REPORT N COMMAND [ARGUMENT...]
//
// Between two such calls the files on the disk are the same, so a kill before each of them is a kill at every
// moment that makes a difference. A child of the program that makes the call is killed with it. With N = 0
// nothing is killed. With KILLAT_ALL set every system call counts. The calls that counted are written to
// REPORT, a line "NUMBER NAME" each. The exit status is the program's, or 128 + the signal.
#include <fcntl.h>
#include <sys/ptrace.h>
#include <sys/syscall.h>
#include <sys/wait.h>
#include <unistd.h>
#include <csignal>
#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <set>
#include <utility>

namespace {

constexpr std::pair<long, const char*> kChanging[] = {
    {SYS_rename, "rename"},       {SYS_renameat, "renameat"},     {SYS_renameat2, "renameat2"},
    {SYS_unlink, "unlink"},       {SYS_unlinkat, "unlinkat"},     {SYS_rmdir, "rmdir"},
    {SYS_mkdir, "mkdir"},         {SYS_mkdirat, "mkdirat"},       {SYS_link, "link"},
    {SYS_linkat, "linkat"},       {SYS_symlink, "symlink"},       {SYS_symlinkat, "symlinkat"},
    {SYS_truncate, "truncate"},   {SYS_ftruncate, "ftruncate"},   {SYS_fallocate, "fallocate"},
    {SYS_chmod, "chmod"},         {SYS_fchmod, "fchmod"},         {SYS_fchmodat, "fchmodat"},
    {SYS_chown, "chown"},         {SYS_fchown, "fchown"},         {SYS_fchownat, "fchownat"},
    {SYS_fsetxattr, "fsetxattr"}, {SYS_utimensat, "utimensat"},   {SYS_sendfile, "sendfile"},
    {SYS_fsync, "fsync"},         {SYS_fdatasync, "fdatasync"},   {SYS_syncfs, "syncfs"},
    {SYS_flock, "flock"},         {SYS_exit_group, "exit_group"}, {SYS_copy_file_range, "copy_file_range"},
};
constexpr std::pair<long, const char*> kWriting[] = {
    {SYS_write, "write"}, {SYS_pwrite64, "pwrite"}, {SYS_writev, "writev"}, {SYS_pwritev, "pwritev"}};

bool creates(uint64_t flags) { return (flags & (O_CREAT | O_TRUNC)) != 0; }

// The name of a call that counts, or null. What goes to the standard streams changes no file.
const char* counted(const __ptrace_syscall_info& info) {
    static const bool all = getenv("KILLAT_ALL") != nullptr;
    const long number = static_cast<long>(info.entry.nr);
    for (const auto& [call, name] : kChanging)
        if (call == number) return name;
    for (const auto& [call, name] : kWriting)
        if (call == number && info.entry.args[0] > 2) return name;
    if ((number == SYS_openat && creates(info.entry.args[2])) ||
        (number == SYS_open && creates(info.entry.args[1])))
        return "open";
    return all ? "other" : nullptr;
}

[[noreturn]] void die(const char* what) {
    perror(what);
    exit(125);
}

[[noreturn]] void become(char** command) {
    if (ptrace(PTRACE_TRACEME, 0, nullptr, nullptr) != 0) die("killat: PTRACE_TRACEME");
    raise(SIGSTOP);
    execvp(command[0], command);
    die("killat: exec");
}

// Follows all threads and children of `program` to its end.
int follow(pid_t program, long target, FILE* report) {
    std::set<pid_t> known{program};
    long number = 0;
    for (int status = 0;;) {
        const pid_t id = waitpid(-1, &status, __WALL);
        if (id < 0) die("killat: waitpid");
        if (WIFEXITED(status) || WIFSIGNALED(status)) {
            if (id == program) return WIFEXITED(status) ? WEXITSTATUS(status) : 128 + WTERMSIG(status);
            continue;
        }
        int signal = WSTOPSIG(status);
        if (signal == (SIGTRAP | 0x80)) {
            signal = 0;
            __ptrace_syscall_info info{};
            ptrace(PTRACE_GET_SYSCALL_INFO, id, reinterpret_cast<void*>(sizeof info), &info);
            const char* name = info.op == PTRACE_SYSCALL_INFO_ENTRY ? counted(info) : nullptr;
            if (name) fprintf(report, "%ld %s\n", ++number, name);
            if (name && number == target) {
                kill(program, SIGKILL);
                kill(id, SIGKILL);  // a child, before its call is made
            }
        } else if ((status >> 16) != 0 || (signal == SIGSTOP && known.insert(id).second)) {
            signal = 0;  // an event of the tracing, or the first stop of a new thread
        }
        ptrace(PTRACE_SYSCALL, id, nullptr, signal);
    }
}

}  // namespace

int main(int count, char** arguments) {
    if (count < 4) return 125;
    FILE* report = fopen(arguments[1], "we");
    if (!report) die(arguments[1]);
    const pid_t program = fork();
    if (program == 0) become(arguments + 3);
    int status = 0;
    if (program < 0 || waitpid(program, &status, 0) != program || !WIFSTOPPED(status)) die("killat: fork");
    const long options = PTRACE_O_TRACESYSGOOD | PTRACE_O_TRACECLONE | PTRACE_O_TRACEFORK |
                         PTRACE_O_TRACEVFORK | PTRACE_O_TRACEEXEC | PTRACE_O_EXITKILL;
    if (ptrace(PTRACE_SETOPTIONS, program, nullptr, options) != 0) die("killat: PTRACE_SETOPTIONS");
    ptrace(PTRACE_SYSCALL, program, nullptr, nullptr);
    const int result = follow(program, atol(arguments[2]), report);
    fclose(report);
    return result;
}

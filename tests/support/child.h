// A part of a test in a process of its own, which may be killed between any two system calls or see calls
// fail.
#pragma once

#include <cerrno>
#include <csignal>
#include <cstddef>
#include <initializer_list>
#include <vector>

#include <linux/audit.h>
#include <linux/filter.h>
#include <linux/seccomp.h>
#include <sys/prctl.h>
#include <sys/ptrace.h>
#include <sys/syscall.h>
#include <sys/user.h>
#include <sys/wait.h>
#include <unistd.h>

// What `run` returns, as an exit status.
template <class Run>
int inChild(Run run) {
    const pid_t child = fork();
    if (child == 0) _exit(run());
    int status = 0;
    waitpid(child, &status, 0);
    return WIFEXITED(status) ? WEXITSTATUS(status) : 128 + WTERMSIG(status);
}

// Runs `run` in a child that is killed before its n-th system call, from 1. False if it ended before.
template <class Run>
bool killedBefore(int n, Run run) {
    const pid_t child = fork();
    if (child == 0) {
        ptrace(PTRACE_TRACEME, 0, nullptr, nullptr);
        raise(SIGSTOP);
        _exit(run());
    }
    int status = 0;
    waitpid(child, &status, 0);
    // Each call stops the child twice, when it begins and when it ends.
    for (int stops = 0; stops < 2 * n - 1; ++stops) {
        ptrace(PTRACE_SYSCALL, child, nullptr, nullptr);
        waitpid(child, &status, 0);
        if (!WIFSTOPPED(status)) return false;
    }
    kill(child, SIGKILL);
    waitpid(child, &status, 0);
    return true;
}

#ifdef __x86_64__
// Runs `run` in a child whose n-th call of this number, from 1, fails with `error`. Its exit status, or -1 if
// there were not as many such calls.
template <class Run>
int withFailure(long number, int n, int error, Run run) {
    const pid_t child = fork();
    if (child == 0) {
        ptrace(PTRACE_TRACEME, 0, nullptr, nullptr);
        raise(SIGSTOP);
        _exit(run());
    }
    int status = 0, seen = 0;
    waitpid(child, &status, 0);
    for (bool begins = true, fails = false;; begins = !begins) {
        ptrace(PTRACE_SYSCALL, child, nullptr, nullptr);
        waitpid(child, &status, 0);
        if (!WIFSTOPPED(status)) break;
        user_regs_struct registers{};
        if (!fails && !begins) continue;
        ptrace(PTRACE_GETREGS, child, nullptr, &registers);
        if (begins && static_cast<long>(registers.orig_rax) == number && ++seen == n) {
            registers.orig_rax = static_cast<unsigned long long>(-1);  // no call at all
            fails = true;
        } else if (!begins) {
            registers.rax = static_cast<unsigned long long>(-error);
            fails = false;
        }
        ptrace(PTRACE_SETREGS, child, nullptr, &registers);
    }
    return seen < n ? -1 : WIFEXITED(status) ? WEXITSTATUS(status) : 128 + WTERMSIG(status);
}
#endif

// From now on these system calls of this process fail with `error`.
inline void failCalls(std::initializer_list<int> numbers, int error) {
    std::vector<sock_filter> program{BPF_STMT(BPF_LD | BPF_W | BPF_ABS, offsetof(seccomp_data, nr))};
    for (const int number : numbers) {
        program.push_back(BPF_JUMP(BPF_JMP | BPF_JEQ | BPF_K, static_cast<unsigned>(number), 0, 1));
        program.push_back(BPF_STMT(BPF_RET | BPF_K, SECCOMP_RET_ERRNO | static_cast<unsigned>(error)));
    }
    program.push_back(BPF_STMT(BPF_RET | BPF_K, SECCOMP_RET_ALLOW));
    const sock_fprog filter{static_cast<unsigned short>(program.size()), program.data()};
    prctl(PR_SET_NO_NEW_PRIVS, 1, 0, 0, 0);
    prctl(PR_SET_SECCOMP, SECCOMP_MODE_FILTER, &filter);
}

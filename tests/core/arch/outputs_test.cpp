// Outputs that are no files: which end waits for the other, and what ends the wait.
#include <fcntl.h>
#include <poll.h>
#include <pty.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <termios.h>
#include <unistd.h>
#include <csignal>
#include <thread>

#include "core/arch/qvcancel.h"
#include "tests/support/checks.h"
#include "tests/support/wav_bytes.h"

namespace {

constexpr int kHang = 60'000;  // ms

bool readable(int fd) {
    pollfd wanted{fd, POLLIN, 0};
    return poll(&wanted, 1, kHang) == 1;
}

struct StreamOutputs : testing::Test {
    StreamOutputs() { std::signal(SIGPIPE, SIG_IGN); }
    ~StreamOutputs() override {
        std::signal(SIGPIPE, SIG_DFL);
        for (const int end : ends)
            if (end >= 0) close(end);
    }
    std::FILE* open(const std::string& name) {
        return qv_platform().openOutput(name.c_str(), cancel, isStream);
    }
    std::string fifo() {
        const std::string name = temp.file("fifo");
        EXPECT_EQ(mkfifo(name.c_str(), 0600), 0);
        return name;
    }
    static std::string own(int fd) { return "/dev/fd/" + std::to_string(fd); }
    // Writes more than any pipe holds until the request comes that `reader` having data allows.
    void writesUntilTheRequest(std::FILE* file, int reader) {
        ASSERT_TRUE(file) << std::strerror(errno);
        EXPECT_TRUE(isStream);
        const std::string much(8'000'000, 'm');
        std::thread asking([&] {
            EXPECT_TRUE(readable(reader));
            cancel->request();
        });
        errno = 0;
        EXPECT_LT(std::fwrite(much.data(), 1, much.size(), file), much.size());
        EXPECT_EQ(errno, ECANCELED);
        EXPECT_TRUE(cancel->gaveUp());
        asking.join();
        std::fclose(file);
        cancel->clear();
    }

    TempFolder temp;
    std::shared_ptr<QvCancel> cancel = std::make_shared<QvCancel>();
    bool isStream = false;
    int ends[2] = {-1, -1};
};

TEST_F(StreamOutputs, ARequestEndsTheOpeningOfAPipeThatNobodyReads) {
    const std::string name = fifo();
    std::thread asking([&] { cancel->request(); });
    EXPECT_FALSE(open(name));
    EXPECT_EQ(errno, ECANCELED);
    asking.join();
    EXPECT_FALSE(open(name)) << "until it is taken back";
    EXPECT_EQ(errno, ECANCELED);
    cancel->clear();
    std::thread reading([&] { ends[0] = ::open(name.c_str(), O_RDONLY | O_CLOEXEC); });
    std::FILE* const file = open(name);
    reading.join();
    ASSERT_TRUE(file);
    EXPECT_EQ(std::fwrite("seen", 1, 4, file), 4u);
    char got[5] = {};
    EXPECT_EQ(read(ends[0], got, 4), 4);
    EXPECT_STREQ(got, "seen");
    std::fclose(file);
}

TEST_F(StreamOutputs, ARequestEndsAWriteThatNobodyReads) {
    const std::string name = fifo();
    ends[0] = ::open(name.c_str(), O_RDONLY | O_NONBLOCK | O_CLOEXEC);
    writesUntilTheRequest(open(name), ends[0]);
    close(ends[0]);

    ASSERT_EQ(pipe2(ends, O_CLOEXEC), 0);
    writesUntilTheRequest(open(own(ends[1])), ends[0]);
    EXPECT_FALSE(fcntl(ends[1], F_GETFL) & O_NONBLOCK) << "others that share the pipe would see it";
    close(ends[0]), close(ends[1]);

    ASSERT_EQ(socketpair(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0, ends), 0);
    writesUntilTheRequest(open(own(ends[1])), ends[0]);
    EXPECT_FALSE(fcntl(ends[1], F_GETFL) & O_NONBLOCK);
    close(ends[0]), close(ends[1]);

    termios raw{};
    cfmakeraw(&raw);
    char terminal[100];
    ASSERT_EQ(openpty(&ends[0], &ends[1], terminal, &raw, nullptr), 0);
    writesUntilTheRequest(open(terminal), ends[0]);
}

TEST_F(StreamOutputs, WhatIsReadArrivesWholeAfterARequestToo) {
    ASSERT_EQ(pipe2(ends, O_CLOEXEC), 0);
    std::FILE* const file = open(own(ends[1]));
    ASSERT_TRUE(file);
    close(std::exchange(ends[1], -1));
    const std::string sent = patternBytes(3'000'000);
    std::string got;
    std::thread reading([&] {
        char block[65536];
        for (ssize_t n; (n = read(ends[0], block, sizeof block)) > 0;) got.append(block, size_t(n));
    });
    EXPECT_EQ(std::fwrite(sent.data(), 1, sent.size(), file), sent.size());
    cancel->request();
    EXPECT_EQ(std::fwrite("end", 1, 3, file), 3u);
    std::fclose(file);
    reading.join();
    EXPECT_TRUE(got == sent + "end");
    EXPECT_FALSE(cancel->gaveUp());
}

TEST_F(StreamOutputs, AReaderThatGoesEndsTheWrite) {
    ASSERT_EQ(pipe2(ends, O_CLOEXEC), 0);
    std::FILE* const file = open(own(ends[1]));
    ASSERT_TRUE(file);
    const std::string much(1'000'000, 'm');
    std::thread going([&] {
        EXPECT_TRUE(readable(ends[0]));
        close(std::exchange(ends[0], -1));
    });
    errno = 0;
    EXPECT_LT(std::fwrite(much.data(), 1, much.size(), file), much.size());
    EXPECT_EQ(errno, EPIPE);
    going.join();
    std::fclose(file);
}

TEST_F(StreamOutputs, AnInheritedFileIsWrittenWhereItStands) {
    const std::string name = temp.write("log", "first\nlast\n");
    ends[0] = ::open(name.c_str(), O_WRONLY | O_CLOEXEC);
    ASSERT_EQ(lseek(ends[0], 6, SEEK_SET), 6);
    std::FILE* const file = open(own(ends[0]));
    ASSERT_TRUE(file);
    EXPECT_TRUE(isStream);
    std::fputs("our", file);
    std::fclose(file);
    EXPECT_EQ(write(ends[0], "s", 1), 1) << "stays open, one position for both";
    EXPECT_EQ(TempFolder::read(name), "first\nours\n");

    ends[1] = ::open(name.c_str(), O_RDONLY | O_CLOEXEC);
    EXPECT_FALSE(open(own(ends[1])));
    EXPECT_EQ(errno, EBADF);
    EXPECT_FALSE(open("/dev/fd/1000000"));
    EXPECT_EQ(errno, EBADF);
}

TEST_F(StreamOutputs, FilesAreFilesAndDevicesTellTheirReason) {
    const std::string name = temp.write("file", "longer than the new one");
    std::FILE* file = open(name);
    ASSERT_TRUE(file);
    EXPECT_FALSE(isStream);
    cancel->request();
    EXPECT_GE(std::fputs("new", file), 0) << "a request is nothing to a file";
    EXPECT_EQ(std::fclose(file), 0);
    EXPECT_EQ(TempFolder::read(name), "new");
    cancel->clear();

    file = open("/dev/full");
    ASSERT_TRUE(file);
    EXPECT_TRUE(isStream);
    errno = 0;
    EXPECT_EQ(std::fwrite("x", 1, 1, file), 0u);
    EXPECT_EQ(errno, ENOSPC);
    std::fclose(file);
    EXPECT_FALSE(open(temp.path().string()));
    EXPECT_EQ(errno, EISDIR);
}

}  // namespace

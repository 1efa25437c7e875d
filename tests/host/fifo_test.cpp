// SPDX-License-Identifier: LGPL-2.1-or-later
#include "support/namespace_test.h"

#include <bluetooth/auto_connect.h>
#include <bluetooth/fifo.h>

#include <signal.h>

#include <cerrno>
#include <memory>
#include <thread>
#include <tuple>

namespace Bluetooth::Test {

namespace {

using FifoPtr = std::unique_ptr<Fifo>;
constexpr const char* path = "/tmp/test_pipe";
const std::string notOpened = "fifo.cpp Error opening the named file";

} // namespace

class FifoTest : public NamespaceTest {};

TEST_F(FifoTest, ReaderWaitsForAWriterAndGetsWhatItWrites) {
    FifoPtr writer;
    std::thread other([&writer] {
        // ENXIO until the reader is there; every attempt is logged.
        while (!writer)
            writer.reset(Fifo::getWriteFifo(path));
        EXPECT_EQ(writer->writeData("hello", 5), 0);
    });
    const FifoPtr reader(Fifo::getReadFifo(path));
    other.join();
    ASSERT_NE(reader, nullptr);
    char buffer[16] = {};
    EXPECT_EQ(reader->readData(buffer, sizeof buffer), 0);
    EXPECT_STREQ(buffer, "hello");

    writer.reset();
    EXPECT_EQ(reader->readData(buffer, sizeof buffer), 0) << "the end of the data is no failure";
    EXPECT_STREQ(buffer, "hello");
}

TEST_F(FifoTest, DescriptorsAreClosedOnceAndNotInherited) {
    const PipeReader reader(path);
    const int next = dup(0); // what the pipe's descriptor will be
    close(next);
    const auto before = countOpenDescriptors();
    FifoPtr writer(Fifo::getWriteFifo(path));
    ASSERT_NE(writer, nullptr);
    EXPECT_EQ(fcntl(next, F_GETFD), FD_CLOEXEC);
    writer.reset();
    EXPECT_EQ(countOpenDescriptors(), before);
    EXPECT_TRUE(std::filesystem::is_fifo(path)) << "the file stays";
}

TEST_F(FifoTest, FailedWritesAreLoggedAndRaiseNoSignal) {
    auto reader = std::make_unique<PipeReader>(path);
    const FifoPtr writer(Fifo::getWriteFifo(path));
    ASSERT_NE(writer, nullptr);
    EXPECT_EQ(writer->writeData(nullptr, 5), -1);
    EXPECT_EQ(log.take(), Texts()) << "null data is no event for the log";

    const std::vector<char> tooMuch(1 << 20);
    EXPECT_EQ(writer->writeData(tooMuch.data(), 1 << 20), -1) << "a short write";
    EXPECT_EQ(writer->writeData("1", 1), -1) << "a full pipe";
    reader.reset();
    EXPECT_EQ(writer->writeData("1", 1), -1) << "no reader any more; SIGPIPE would end the test";
    EXPECT_EQ(log.take(), Texts(3, "fifo.cpp Error writing the data to the pipe file."));
    sigset_t pending;
    sigpending(&pending);
    EXPECT_EQ(sigismember(&pending, SIGPIPE), 0);
}

TEST_F(FifoTest, FailuresToOpenHaveTheirOwnWords) {
    writeFile("/tmp/file", "text");
    std::filesystem::create_symlink("/tmp/file", "/tmp/link");
    std::filesystem::create_symlink("/nowhere", "/tmp/dangling");
    const std::tuple<const char*, int, int> cases[] = {
        {nullptr, 7, 7}, // errno stays
        {"/nowhere/pipe", ENOENT, ENOENT},
        {"/tmp", EISDIR, EACCES},
        {"/tmp/file", EACCES, EACCES},
        {"/dev/null", EACCES, EACCES},
        {"/tmp/link", ELOOP, ELOOP},
        {"/tmp/dangling", ELOOP, ELOOP},
    };
    const auto before = countOpenDescriptors();
    for (const auto& [bad, writing, reading] : cases) {
        errno = 7;
        EXPECT_EQ(Fifo::getWriteFifo(bad), nullptr);
        EXPECT_EQ(errno, writing) << bad;
        EXPECT_EQ(log.take(), (Texts{notOpened + " " + (bad ? bad : "(null)") + ", errno is " +
                                         std::to_string(writing) + ".",
                                     notOpened + "."}));
        errno = 7;
        EXPECT_EQ(Fifo::getReadFifo(bad), nullptr);
        EXPECT_EQ(errno, reading) << bad;
        EXPECT_EQ(log.take(), Texts{notOpened + "."});
    }
    EXPECT_EQ(readFile("/tmp/file"), "text");
    EXPECT_EQ(countOpenDescriptors(), before);
}

TEST_F(FifoTest, OnlyPipesOfRootAndOfTheOwnUserAreUsed) {
    if (geteuid() != 0)
        GTEST_SKIP() << "only root can act for other users";
    constexpr uid_t user = 1234;
    constexpr uid_t other = 1235;
    for (const auto& [owner, caller, isUsed] :
         {std::tuple(user, 0U, false), std::tuple(user, user, true), std::tuple(0U, user, true),
          std::tuple(other, user, false)}) {
        std::filesystem::remove(path);
        const PipeReader reader(path);
        std::filesystem::permissions(path, std::filesystem::perms(0666));
        ASSERT_EQ(chown(path, owner, owner), 0);
        const PipeReader keeper(path, O_RDWR); // so that nobody waits
        ASSERT_EQ(seteuid(caller), 0);
        for (auto* open : {&Fifo::getWriteFifo, &Fifo::getReadFifo}) {
            errno = 0;
            EXPECT_EQ(FifoPtr(open(path)) != nullptr, isUsed) << owner << ' ' << caller;
            EXPECT_EQ(errno == EACCES, !isUsed);
        }
        ASSERT_EQ(seteuid(0), 0);
    }
}

TEST_F(FifoTest, ReadErrorsAreLogged) {
    const PipeReader keeper(path, O_RDWR);
    const FifoPtr reader(Fifo::getReadFifo(path));
    ASSERT_NE(reader, nullptr);
    ASSERT_EQ(FifoPtr(Fifo::getWriteFifo(path))->writeData("text", 4), 0);
    EXPECT_EQ(reader->readData(nullptr, 5), -1);
    char buffer[8] = {};
    EXPECT_EQ(reader->readData(buffer, -1), -1);
    EXPECT_EQ(log.take(), Texts(2, "fifo.cpp Error reading the data to the pipe file."));
    EXPECT_EQ(reader->readData(buffer, 2), 0);
    EXPECT_STREQ(buffer, "te");
}

TEST_F(FifoTest, CommandsAreWrittenWithoutAnyEndToAPipeOnly) {
    const AutoConnect autoConnect;
    const mode_t mask = umask(0);
    EXPECT_FALSE(autoConnect.reload());
    EXPECT_EQ(errno, ENXIO) << "nobody reads it";
    umask(mask);
    EXPECT_EQ(log.take(), Texts{notOpened + " /tmp/kes_bluetooth_autoconnect, errno is 6."});
    EXPECT_TRUE(std::filesystem::is_fifo(commandPipe)) << "but it stays";
    EXPECT_EQ(std::filesystem::status(commandPipe).permissions(), std::filesystem::perms(0666));

    const PipeReader reader(commandPipe);
    EXPECT_TRUE(autoConnect.reload());
    EXPECT_TRUE(autoConnect.pause());
    EXPECT_TRUE(autoConnect.resume());
    EXPECT_TRUE(autoConnect.sendCommand("x"));
    EXPECT_FALSE(autoConnect.sendCommand(nullptr));
    EXPECT_EQ(errno, EINVAL);
    EXPECT_EQ(reader.take(), "1pauseresumex");
    EXPECT_EQ(log.take(), Texts());

    // Where an ordinary user laid a link to a file of root's.
    std::filesystem::remove(commandPipe);
    writeFile("/tmp/secret", "old text");
    std::filesystem::create_symlink("/tmp/secret", commandPipe);
    EXPECT_FALSE(autoConnect.pause());
    EXPECT_EQ(errno, ELOOP);
    EXPECT_EQ(readFile("/tmp/secret"), "old text");
}

} // namespace Bluetooth::Test

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
    const std::tuple<const char*, int, const char*> cases[] = {
        {nullptr, EINVAL, " (null), errno is 22."},
        {"/nowhere/pipe", ENOENT, " /nowhere/pipe, errno is 2."},
        {"/tmp", EISDIR, " /tmp, errno is 21."},
    };
    for (const auto& [bad, error, line] : cases) {
        errno = 0;
        EXPECT_EQ(Fifo::getWriteFifo(bad), nullptr);
        EXPECT_EQ(errno, error);
        EXPECT_EQ(log.take(), (Texts{notOpened + line, notOpened + "."}));
        if (error == EISDIR)
            continue; // a folder can be opened for reading
        errno = 0;
        EXPECT_EQ(Fifo::getReadFifo(bad), nullptr);
        EXPECT_EQ(errno, error);
        EXPECT_EQ(log.take(), Texts{notOpened + "."});
    }
}

TEST_F(FifoTest, ReadErrorsAreLogged) {
    writeFile(path, "text");
    const FifoPtr file(Fifo::getReadFifo(path)); // what stands at the path is not looked at
    ASSERT_NE(file, nullptr);
    EXPECT_EQ(file->readData(nullptr, 5), -1);
    char buffer[8] = {};
    EXPECT_EQ(file->readData(buffer, -1), -1);
    EXPECT_EQ(log.take(), Texts(2, "fifo.cpp Error reading the data to the pipe file."));
    EXPECT_EQ(file->readData(buffer, 2), 0);
    EXPECT_STREQ(buffer, "te");
}

TEST_F(FifoTest, CommandsAreWrittenWithoutAnyEndToWhateverStandsThere) {
    const AutoConnect autoConnect;
    const mode_t mask = umask(0);
    EXPECT_FALSE(autoConnect.reload()) << "nobody reads it";
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
    EXPECT_EQ(reader.take(), "1pauseresumex");

    std::filesystem::remove(commandPipe);
    writeFile(commandPipe, "old text");
    EXPECT_TRUE(autoConnect.pause());
    EXPECT_EQ(readFile(commandPipe), "pauseext");
    EXPECT_EQ(log.take(), Texts());
}

} // namespace Bluetooth::Test

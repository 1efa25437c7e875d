#include "host/namespace_test.h"

#include <bluetooth/auto_connect.h>
#include <bluetooth/fifo.h>

#include <fcntl.h>
#include <signal.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <memory>
#include <thread>
#include <vector>

namespace Bluetooth::Test {

namespace {

using FifoPtr = std::unique_ptr<Fifo>;
using Lines = std::vector<std::string>;

constexpr const char* path = "/tmp/test_pipe";

/// A reader that does not wait for a writer.
class Reader {
public:
    explicit Reader(const char* pipe) {
        mkfifo(pipe, 0600);
        m_descriptor = open(pipe, O_RDONLY | O_NONBLOCK | O_CLOEXEC);
    }
    ~Reader() { close(m_descriptor); }
    Reader(const Reader&) = delete;
    Reader& operator=(const Reader&) = delete;

    std::string read() const {
        char bytes[100];
        const ssize_t length = ::read(m_descriptor, bytes, sizeof bytes);
        return length < 0 ? "error" : std::string(bytes, static_cast<std::size_t>(length));
    }

private:
    int m_descriptor;
};

mode_t modeOf(const char* file) {
    struct stat status {};
    return stat(file, &status) == 0 ? status.st_mode : 0;
}

int openDescriptors() {
    const std::filesystem::directory_iterator all("/proc/self/fd");
    return static_cast<int>(std::distance(begin(all), end(all)));
}

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
    std::fill(std::begin(buffer), std::end(buffer), 'x');
    EXPECT_EQ(reader->readData(buffer, sizeof buffer), 0) << "the end of the data is no failure";
    EXPECT_EQ(std::string(buffer, sizeof buffer), std::string(16, 'x'));
}

TEST_F(FifoTest, DescriptorsAreClosedOnceAndNotInherited) {
    const Reader reader(path);
    const int before = openDescriptors();
    FifoPtr writer(Fifo::getWriteFifo(path));
    ASSERT_NE(writer, nullptr);
    EXPECT_EQ(openDescriptors(), before + 1);
    for (const auto& entry : std::filesystem::directory_iterator("/proc/self/fd")) {
        std::error_code gone;
        if (std::filesystem::read_symlink(entry, gone) == path) {
            EXPECT_EQ(fcntl(std::stoi(entry.path().filename()), F_GETFD), FD_CLOEXEC);
        }
    }
    writer.reset();
    EXPECT_EQ(openDescriptors(), before);
    EXPECT_TRUE(S_ISFIFO(modeOf(path))) << "the file stays";
}

TEST_F(FifoTest, FailedWritesAreLoggedAndRaiseNoSignal) {
    auto reader = std::make_unique<Reader>(path);
    const FifoPtr writer(Fifo::getWriteFifo(path));
    ASSERT_NE(writer, nullptr);
    EXPECT_EQ(writer->writeData(nullptr, 5), -1);
    EXPECT_EQ(log.take(), Lines()) << "null data is no event for the log";

    const std::vector<char> tooMuch(1 << 20);
    EXPECT_EQ(writer->writeData(tooMuch.data(), 1 << 20), -1) << "a short write";
    EXPECT_EQ(writer->writeData("1", 1), -1) << "a full pipe";
    reader.reset();
    EXPECT_EQ(writer->writeData("1", 1), -1) << "no reader any more; SIGPIPE would end the test";
    EXPECT_EQ(log.take(), Lines(3, "fifo.cpp Error writing the data to the pipe file."));
    sigset_t pending;
    sigpending(&pending);
    EXPECT_EQ(sigismember(&pending, SIGPIPE), 0);
}

TEST_F(FifoTest, FailuresToOpenHaveTheirOwnWords) {
    const struct {
        const char* path;
        int error;
    } cases[] = {{nullptr, EINVAL}, {"", ENOENT}, {"/nowhere/pipe", ENOENT}, {"/tmp", EISDIR}};
    for (const auto& testCase : cases) {
        errno = 0;
        EXPECT_EQ(Fifo::getWriteFifo(testCase.path), nullptr);
        EXPECT_EQ(errno, testCase.error);
        const std::string shown = testCase.path ? testCase.path : "(null)";
        EXPECT_EQ(log.take(), (Lines{"fifo.cpp Error opening the named file " + shown +
                                         ", errno is " + std::to_string(testCase.error) + ".",
                                     "fifo.cpp Error opening the named file."}));
    }
    for (const char* bad : {static_cast<const char*>(nullptr), "/nowhere/pipe"}) {
        errno = 0;
        EXPECT_EQ(Fifo::getReadFifo(bad), nullptr);
        EXPECT_EQ(errno, bad ? ENOENT : EINVAL);
        EXPECT_EQ(log.take(), Lines{"fifo.cpp Error opening the named file."});
    }
}

TEST_F(FifoTest, ReadErrorsAreLogged) {
    writeFile(path, "text");
    const FifoPtr file(Fifo::getReadFifo(path)); // what stands at the path is not looked at
    ASSERT_NE(file, nullptr);
    EXPECT_EQ(file->readData(nullptr, 5), -1);
    char buffer[8] = {};
    EXPECT_EQ(file->readData(buffer, -1), -1);
    EXPECT_EQ(log.take(), Lines(2, "fifo.cpp Error reading the data to the pipe file."));
    EXPECT_EQ(file->readData(buffer, 2), 0);
    EXPECT_STREQ(buffer, "te");
}

TEST_F(FifoTest, CommandsAreWrittenWithoutAnyEnd) {
    const Reader reader(commandPipe);
    const AutoConnect autoConnect;
    EXPECT_TRUE(autoConnect.reload());
    EXPECT_TRUE(autoConnect.pause());
    EXPECT_TRUE(autoConnect.reload());
    EXPECT_TRUE(autoConnect.resume());
    EXPECT_TRUE(autoConnect.sendCommand("x"));
    EXPECT_FALSE(autoConnect.sendCommand(nullptr));
    EXPECT_EQ(reader.read(), "1pause1resumex");
    EXPECT_EQ(log.take(), Lines());
}

TEST_F(FifoTest, CommandWithoutAReaderFailsWithOneLineAndLeavesThePipe) {
    const mode_t mask = umask(0);
    EXPECT_FALSE(AutoConnect().reload());
    umask(mask);
    EXPECT_EQ(log.take(), Lines{"fifo.cpp Error opening the named file "
                                "/tmp/kes_bluetooth_autoconnect, errno is 6."});
    EXPECT_EQ(modeOf(commandPipe), static_cast<mode_t>(S_IFIFO | 0666));
}

TEST_F(FifoTest, CommandIsWrittenIntoAnOrdinaryFileThatStandsThere) {
    writeFile(commandPipe, "old text");
    EXPECT_TRUE(AutoConnect().pause());
    EXPECT_EQ(readFile(commandPipe), "pauseext");
}

} // namespace Bluetooth::Test

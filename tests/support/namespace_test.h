// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_TESTS_NAMESPACE_TEST_H
#define KESBLUETOOTH_TESTS_NAMESPACE_TEST_H

#include "support/syslog_capture.h"

#include <gtest/gtest.h>

#include <fcntl.h>
#include <sys/file.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <sstream>
#include <stdexcept>
#include <string>

namespace Bluetooth::Test {

inline constexpr const char* configFolder = "/etc/bluetooth/autoconnect/";
inline constexpr const char* commandPipe = "/tmp/kes_bluetooth_autoconnect";

inline std::string readFile(const std::string& path) {
    std::ostringstream content;
    content << std::ifstream(path, std::ios::binary).rdbuf();
    return content.str();
}

inline void writeFile(const std::string& path, const std::string& content) {
    std::ofstream(path, std::ios::binary) << content;
}

inline void writeProgram(const std::string& path, const std::string& script) {
    writeFile(path, "#!/bin/sh\n" + script);
    std::filesystem::permissions(path, std::filesystem::perms(0755));
}

inline auto countOpenDescriptors(const std::string& folder = "/proc/self/fd") {
    return std::distance(std::filesystem::directory_iterator(folder), {});
}

/// How lines of the auto-connect files, and of the PID file, are logged.
inline std::string inAutoConnect(const std::string& message) {
    return "auto_connect.cpp " + message;
}

/// A daemon's end of a pipe, which is locked and does not wait for a writer.
class PipeReader {
public:
    explicit PipeReader(const char* pipe, int access = O_RDONLY) {
        mkfifo(pipe, 0600);
        m_descriptor = open(pipe, access | O_NONBLOCK | O_CLOEXEC);
        flock(m_descriptor, LOCK_EX | LOCK_NB);
    }
    ~PipeReader() { close(m_descriptor); }
    PipeReader(const PipeReader&) = delete;
    PipeReader& operator=(const PipeReader&) = delete;

    /// @return what has been written since the last call
    std::string take() const {
        char bytes[100];
        const ssize_t length = read(m_descriptor, bytes, sizeof bytes);
        return std::string(bytes, length < 0 ? 0 : static_cast<std::size_t>(length));
    }

private:
    int m_descriptor;
};

/// Uses the library's fixed paths, which are this test's own: ctest runs it through
/// tests/host/in_namespace.sh. Begins with an empty /etc/bluetooth.
class NamespaceTest : public ::testing::Test {
protected:
    NamespaceTest() {
        if (!getenv("KESBLUETOOTH_TEST_NAMESPACE"))
            throw std::logic_error("this would change the machine's own files: run it with ctest, "
                                   "or through tests/host/in_namespace.sh BUILD_FOLDER");
        for (const char* left : {"/etc/bluetooth", commandPipe, "/tmp/test_pipe", "/tmp/test.pid",
                                 "/tmp/bluetooth.info_0", "/tmp/bluetoothd-tool", "/small/x"})
            std::filesystem::remove_all(left);
        std::filesystem::create_directory("/etc/bluetooth");
    }

    SyslogCapture log;
};

} // namespace Bluetooth::Test

#endif

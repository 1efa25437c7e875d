#ifndef KESBLUETOOTH_TESTS_NAMESPACE_TEST_H
#define KESBLUETOOTH_TESTS_NAMESPACE_TEST_H

#include "support/syslog_capture.h"

#include <gtest/gtest.h>

#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <sstream>
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

/// Uses the library's fixed paths, which are this test's own: ctest runs it through
/// tests/host/in_namespace.sh. Begins with an empty /etc/bluetooth.
class NamespaceTest : public ::testing::Test {
protected:
    void SetUp() override {
        ASSERT_NE(getenv("KESBLUETOOTH_TEST_NAMESPACE"), nullptr)
            << "this would change the machine's own files: run it with ctest, or through "
               "tests/host/in_namespace.sh BUILD_FOLDER";
        std::filesystem::remove_all("/etc/bluetooth");
        std::filesystem::create_directory("/etc/bluetooth");
        for (const char* left : {commandPipe, "/tmp/test_pipe", "/tmp/test.pid",
                                 "/tmp/bluetooth.info_0", "/tmp/bluetoothd-tool"})
            std::filesystem::remove(left);
    }

    SyslogCapture log;
};

} // namespace Bluetooth::Test

#endif

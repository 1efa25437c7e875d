// SPDX-License-Identifier: LGPL-2.1-or-later
// The HCI version that an adapter's properties get from hciconfig, which is a script of each test.

#include "host/process_lookup.h"
#include "support/namespace_test.h"
#include "support/peer_test.h"

#include <bluetooth/adapter.h>
#include <bluetooth/dict_codec.h>

#include <sys/wait.h>

#include <chrono>
#include <memory>

namespace Bluetooth::Test {

class HciVersionTest : public DaemonTest {
protected:
    void SetUp() override {
        ASSERT_NE(getenv("KESBLUETOOTH_TEST_NAMESPACE"), nullptr)
            << "this would change the machine's own files: run it with ctest";
        std::filesystem::remove(tool);
        daemon.reply("GetProperties", [](Writer& w) {
            w.dict("sv", [](Writer& d) { d.entry("Name", Var{"office"}); });
        });
    }

    /// @return what follows the daemon's property: "HCIVersion: 2.1;" or nothing, "null" without
    /// any
    static std::string version(const char* path = adapterPath) {
        Adapter adapter(path);
        const std::unique_ptr<Dict> dict(adapter.getProperties());
        const std::string text = dict ? dictConquerToString(*dict, ";") : "Name: office;null";
        EXPECT_EQ(text.substr(0, 13), "Name: office;");
        EXPECT_TRUE(!dict || dict->back().second.which() == 3); // a string
        return text.substr(13);
    }

    static constexpr const char* tool = "/usr/bin/hciconfig";
};

TEST_F(HciVersionTest, AToolThatCannotBeStartedOrHangsIsLoggedAndTheEntryIsMissing) {
    const std::string line = "adapter.cpp Failed to get open(/usr/bin/hciconfig hci0)";
    EXPECT_EQ(version(), "");
    EXPECT_EQ(log.take(), Texts{line});

    writeProgram(tool, "echo line; exec sleep 60");
    const auto begin = std::chrono::steady_clock::now();
    EXPECT_EQ(version(), "");
    EXPECT_EQ(log.take(), Texts{line});
    const auto time = std::chrono::steady_clock::now() - begin;
    EXPECT_GE(time, std::chrono::seconds(5));
    EXPECT_LT(time, std::chrono::seconds(10));
    EXPECT_EQ(getPidFromName("sleep"), -1) << "it was ended ...";
    EXPECT_EQ(waitpid(-1, nullptr, WNOHANG), 0) << "... and reaped";
}

TEST_F(HciVersionTest, TheFirstVersionLineCounts) {
    const std::pair<const char*, std::string> cases[] = {
        {"printf '%s:\\tType: Primary\\n\\tHCI Version: %s-of-%s-%s (0x4)  Revision: 0x1\\n' $1 "
         "2.1 $1 $2",
         "2.1-of-hci0--a"},
        {"printf '\\tHCI Version: 3.0\\n\\tHCI Version: 4.0\\n'; exit 1", "3.0"},
        {"printf 'HCI Version: 4.2'", "4.2"}, // no white space, no newline
        {"printf 'x HCI Version: 1\\n\\tLMP Version: 2\\n\\thci version: 3\\n'", ""},
        {"printf '\\tHCI Version: \\n\\tHCI Version:5.0\\n'", "5.0"},
        // Of a line longer than the buffer, what follows counts as a line of its own.
        {"printf '%01023d\\tHCI Version: 5.3\\n' 0", "5.3"},
        {"printf '%01000d\\tHCI Version: 5.4\\n' 0", ""},
        {"printf '\\tHCI Version: %02000d\\n' 7", std::string(1023 - 14, '0')},
        {"printf '\\0\\tHCI Version: 1\\n\\tHCI Version: 5.5\\n'", "5.5"},
        {"printf '\\tHCI Version: 2.0\\n'; while echo more; do :; done", "2.0"}, // without end
    };
    for (const auto& [script, expected] : cases) {
        writeProgram(tool, script);
        EXPECT_EQ(version(), "HCIVersion: " + expected + ";") << script;
    }
    EXPECT_EQ(log.take(), Texts{});
}

TEST_F(HciVersionTest, TheToolIsAskedForTheLastPartOfThePathUnlessTheDaemonFails) {
    writeProgram(tool, "printf '\\tHCI Version: <%s>\\n' \"$1\"");
    EXPECT_EQ(version("/a/b"), "HCIVersion: <b>;");
    EXPECT_EQ(version("/"), "HCIVersion: </>;");
    const std::string trace = testFolder() + "/started";
    writeProgram(tool, "touch " + trace);
    daemon.replyError("GetProperties", "org.bluez.Error.Failed", "Broken");
    EXPECT_EQ(version(), "null");
    EXPECT_FALSE(std::filesystem::exists(trace));
    EXPECT_EQ(log.take(), Texts{"bluez_object.cpp Broken"});
}

} // namespace Bluetooth::Test

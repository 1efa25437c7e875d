// The HCI version that an adapter's properties get from hciconfig, which is a script of each test.

#include "host/namespace_test.h"
#include "support/peer_test.h"

#include <bluetooth/adapter.h>
#include <bluetooth/dict_codec.h>

#include <memory>

namespace Bluetooth::Test {

namespace {
constexpr const char* tool = "/usr/bin/hciconfig";
constexpr const char* notStarted = "adapter.cpp Failed to get open(/usr/bin/hciconfig hci0)";
} // namespace

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

    static void install(const std::string& script) { writeProgram(tool, script); }

    /// @return "Name: office;HCIVersion: 2.1;", "null" without a dictionary
    static std::string properties(const char* path = adapterPath) {
        Adapter adapter(path);
        const std::unique_ptr<Dict> dict(adapter.getProperties());
        if (dict && dict->size() == 2) {
            EXPECT_EQ((*dict)[1].second.which(), 3);
        }
        return dict ? dictConquerToString(*dict, ";") : "null";
    }
};

TEST_F(HciVersionTest, AToolThatCannotBeStartedIsLoggedAndTheEntryIsMissing) {
    EXPECT_EQ(properties(), "Name: office;");
    install("printf '\\tHCI Version: 2.1\\n'\n");
    std::filesystem::permissions(tool, std::filesystem::perms(0644));
    EXPECT_EQ(properties(), "Name: office;");
    install("");
    std::ofstream(tool) << "#!/no/such/shell\n";
    EXPECT_EQ(properties(), "Name: office;");
    std::filesystem::remove(tool);
    std::filesystem::create_directory(tool);
    EXPECT_EQ(properties(), "Name: office;");
    EXPECT_EQ(log.take(), Texts(4, notStarted));
}

TEST_F(HciVersionTest, TheFirstVersionLineCounts) {
    const std::pair<const char*, const char*> cases[] = {
        {"printf '%s:\\tType: Primary\\n\\tHCI Version: %s-of-%s-%s (0x4)  Revision: 0x1\\n' $1 "
         "2.1 $1 $2",
         "2.1-of-hci0--a"},
        {"printf '\\tHCI Version: 3.0\\n\\tHCI Version: 4.0\\n'", "3.0"},
        {"printf ' \\t  HCI Version: 4.1\\n'", "4.1"},
        {"printf 'HCI Version: 4.2'", "4.2"}, // no white space, no newline
        {"printf 'x HCI Version: 1\\n\\tLMP Version: 2\\n\\thci version: 3\\n'", ""},
        {"printf '\\tHCI Version: \\n\\tHCI Version:5.0\\n'", "5.0"},
        {"exit 1", ""},
        {"printf '\\tHCI Version: 5.1\\n'; exit 1", "5.1"},
        {"echo '\tHCI Version: 9' >&2", ""},
        {"read line && echo $line; printf '\\tHCI Version: 5.2\\n'", "5.2"}, // nothing to read
        // Of a line longer than the buffer, what follows counts as a line of its own.
        {"printf '%01023d\\tHCI Version: 5.3\\n' 0", "5.3"},
        {"printf '%01000d\\tHCI Version: 5.4\\n' 0", ""},
        {"printf '\\0\\tHCI Version: 1\\n\\tHCI Version: 5.5\\n'", "5.5"},
        {"i=0; while [ $i -lt 20000 ]; do echo filler; i=$((i+1)); done; "
         "printf '\\tHCI Version: 5.6\\n'",
         "5.6"},
    };
    for (const auto& [script, version] : cases) {
        install(script);
        EXPECT_EQ(properties(), std::string("Name: office;HCIVersion: ") + version + ";") << script;
    }
    EXPECT_EQ(log.take(), Texts{});
}

TEST_F(HciVersionTest, OutputsWithoutEndAndLinesWithoutEndAreReadNoFurtherThanNeeded) {
    install("printf '\\tHCI Version: %02000d\\n' 7");
    EXPECT_EQ(properties(), "Name: office;HCIVersion: " + std::string(1023 - 14, '0') + ";");
    install("printf '\\tHCI Version: 2.0\\n'; while :; do echo more || exit; done");
    EXPECT_EQ(properties(), "Name: office;HCIVersion: 2.0;");
}

TEST_F(HciVersionTest, TheToolIsAskedForTheLastPartOfThePathUnlessTheDaemonFails) {
    install("printf '\\tHCI Version: <%s>\\n' \"$1\"");
    for (const auto& [path, name] :
         {std::pair("/org/bluez/42/hci1", "hci1"), std::pair("/a/b", "b"), std::pair("/", "/")})
        EXPECT_EQ(properties(path), std::string("Name: office;HCIVersion: <") + name + ">;");
    const std::string trace = testFolder() + "/started";
    install("touch " + trace);
    daemon.replyError("GetProperties", "org.bluez.Error.Failed", "Broken");
    EXPECT_EQ(properties(), "null");
    EXPECT_FALSE(std::filesystem::exists(trace));
    EXPECT_EQ(log.take(), Texts{"bluez_object.cpp Broken"});
}

} // namespace Bluetooth::Test

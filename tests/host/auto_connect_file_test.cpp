// SPDX-License-Identifier: LGPL-2.1-or-later
#include "fault/soak.h"
#include "support/namespace_test.h"

#include <bluetooth/auto_connect.h>

#include <signal.h>
#include <sys/syscall.h>
#include <sys/wait.h>

#include <atomic>
#include <cerrno>
#include <functional>
#include <limits>
#include <locale>
#include <random>
#include <thread>
#include <tuple>

namespace {

/// A disk that fails: no file can be read from this place on.
off_t readableUpTo = std::numeric_limits<off_t>::max();

} // namespace

/// Replaces the C library's, also for the C++ library's streams.
extern "C" [[gnu::visibility("default")]] ssize_t read(int fd, void* buf, size_t nbytes) {
    if (lseek(fd, 0, SEEK_CUR) >= readableUpTo) {
        errno = EIO;
        return -1;
    }
    return syscall(SYS_read, fd, buf, nbytes);
}

namespace Bluetooth::Test {

namespace {

constexpr const char* adapter = "AA:BB:CC:DD:EE:FF";

} // namespace

/// The configuration file of one adapter, and a daemon's end of the command pipe.
class AutoConnectFileTest : public NamespaceTest {
protected:
    void write(const std::string& content) {
        std::filesystem::create_directory(configFolder);
        writeFile(file, content);
    }
    std::string content() const { return readFile(file); }
    /// Every operation on the adapter's file fails with the same line.
    void expectAllFail(const std::string& message) {
        EXPECT_FALSE(config.checkConfigFile(file.c_str()));
        EXPECT_FALSE(config.getEnable(adapter));
        EXPECT_FALSE(config.set(adapter, true, ",X"));
        EXPECT_FALSE(config.removeDevice(adapter, "X"));
        EXPECT_EQ(log.take(), Texts(4, inAutoConnect(message)));
        EXPECT_EQ(pipe.take(), "");
    }

    const std::string file = std::string(configFolder) + adapter;
    AutoConnect config;
    PipeReader pipe{commandPipe}; ///< the end of the daemon that is told of changes
};

TEST_F(AutoConnectFileTest, MissingFileIsCreatedDisabledAndEmpty) {
    EXPECT_FALSE(config.getEnable(adapter));
    EXPECT_EQ(content(), "0");
    struct stat status {};
    ASSERT_EQ(stat(configFolder, &status), 0);
    EXPECT_EQ(status.st_mode, static_cast<mode_t>(S_IFDIR | 0755));
    EXPECT_FALSE(config.getEnable("aa:bb:cc:dd:ee:ff"));
    EXPECT_EQ(readFile(std::string(configFolder) + "aa:bb:cc:dd:ee:ff"), "0") << "no case folding";
    EXPECT_EQ(pipe.take(), "");
    EXPECT_EQ(log.take(), Texts());
}

TEST_F(AutoConnectFileTest, SetWritesFlagAndListAsGivenAndTellsTheDaemon) {
    // In such a locale a stream would read "1,112" as one number.
    struct Grouping : std::numpunct<char> {
        char do_thousands_sep() const override { return ','; }
        std::string do_grouping() const override { return "\3"; }
    };
    const std::locale before = std::locale::global(std::locale(std::locale(), new Grouping));
    const std::tuple<bool, const char*, const char*> cases[] = {
        {true, ",112,77:88:99:AA:BB:CC", "1,112,77:88:99:AA:BB:CC"},
        {false, ",11:22:33:44:55:66", "0,11:22:33:44:55:66"},
        {true, "", "1"},
        {true, "11:22", "111:22"}, // no comma is added
    };
    for (const auto& [enable, list, written] : cases) {
        EXPECT_TRUE(config.set(adapter, enable, list));
        EXPECT_EQ(content(), written);
        EXPECT_EQ(pipe.take(), "1");
        EXPECT_EQ(config.getEnable(adapter), enable);
    }
    std::locale::global(before);
    EXPECT_EQ(log.take(), Texts());
    std::filesystem::remove(commandPipe); // without a daemon it succeeds too
    EXPECT_TRUE(config.set(adapter, true, ",A"));
    EXPECT_EQ(content(), "1,A");
    EXPECT_EQ(log.take().size(), 1u) << "the pipe's line only";
}

TEST_F(AutoConnectFileTest, EnableIsANumberAndOnlyAListWithTheFlag1LosesItsExactMatches) {
    const std::string untouched = "untouched";
    const std::tuple<std::string, bool, std::string> cases[] = {
        {"1,A,B,A", true, "1,B"},
        {"1,A", true, "1"},
        {"1,B,a,AA", true, "1,B,a,AA"},
        {"1,A,,B,", true, "1,,B"}, // nothing is read after the last comma
        {"1xA,B", true, "1,B"},    // two bytes are skipped whatever they are
        {" \n1,A", true, "1,1"},
        {"1", true, "1"},
        {std::string("1,A,B\0C,D", 9), true, std::string("1,B\0C,D", 7)},
        {"1,A\n", true, "1,A\n"}, // a line end belongs to the last entry
        {"2,A", true, untouched},
        {"111:22,A", true, untouched},
        {"-1,A", true, untouched},
        {"0,A,B", false, untouched},
        {"", false, untouched},
        {"yes,A", false, untouched},
        {",A", false, untouched},
        {"99999999999999,A", false, untouched},
        {std::string("\0001,A", 4), false, untouched},
    };
    for (const auto& [before, enabled, after] : cases) {
        write(before);
        EXPECT_EQ(config.getEnable(adapter), enabled) << before;
        EXPECT_TRUE(config.removeDevice(adapter, "A"));
        EXPECT_EQ(content(), after == untouched ? before : after);
        EXPECT_EQ(pipe.take(), after == untouched ? "" : "1") << before;
    }
    EXPECT_EQ(log.take(), Texts());
}

TEST_F(AutoConnectFileTest, NullArgumentsAreLogged) {
    const std::pair<std::function<bool()>, const char*> cases[] = {
        {[&] { return config.getEnable(nullptr); }, "Adapter address is null."},
        {[&] { return config.set(nullptr, true, nullptr); }, "Adapter address is null."},
        {[&] { return config.removeDevice(nullptr, nullptr); }, "Adapter address is null."},
        {[&] { return config.getDeviceList(nullptr) != nullptr; }, "Adapter address is null."},
        {[&] { return config.set(adapter, true, nullptr); }, "Device address list is null."},
        {[&] { return config.removeDevice(adapter, nullptr); }, "Device address is null."},
        {[&] { return config.checkConfigFile(nullptr); }, "Config '(null)' can not be open."}};
    for (const auto& [operation, message] : cases) {
        EXPECT_FALSE(operation());
        EXPECT_EQ(log.take(), Texts{inAutoConnect(message)});
    }
    EXPECT_FALSE(std::filesystem::exists(configFolder));
}

TEST_F(AutoConnectFileTest, WhatIsNoUsableFileIsRefusedAndKept) {
    std::filesystem::create_directories(file + "/inside");
    expectAllFail("Config '" + file + "' is not regular file.");
    EXPECT_TRUE(std::filesystem::exists(file + "/inside"));

    std::filesystem::remove_all(file);
    std::filesystem::create_symlink("/nowhere/file", file);
    expectAllFail("Config '" + file + "' can not be open.");

    std::filesystem::remove(file);
    std::filesystem::create_symlink("/real-bin/true", file); // on a read-only file system
    expectAllFail("Config '" + file + "' can not be write/read.");

    std::filesystem::remove_all(configFolder);
    std::filesystem::remove("/etc/bluetooth");
    expectAllFail("Can not create config path '/etc/bluetooth/autoconnect/'");
}

TEST_F(AutoConnectFileTest, AFullDiskIsReportedAndCostsNothing) {
    writeFile("/small/x", "1,A,B");
    writeFile("/small/filler", std::string(100000, 'x'));
    std::filesystem::create_directory(configFolder);
    std::filesystem::create_symlink("/small/x", file);
    EXPECT_FALSE(config.set(adapter, true, std::string(70000, ',').c_str()));
    EXPECT_EQ(log.take(), Texts{inAutoConnect("Can not write config file '" + file + "'.")});
    EXPECT_EQ(pipe.take(), "") << "nothing that is worth reading again";
    EXPECT_EQ(content(), "1,A,B");

    std::filesystem::remove("/small/x");
    std::filesystem::resize_file("/small/filler", 0);
    writeFile("/small/filler", std::string(100000, 'x'));
    EXPECT_FALSE(config.getEnable(adapter)) << "the file can be made, but not its one byte";
    EXPECT_EQ(log.take(), Texts{inAutoConnect("Config '" + file + "' can not be written.")});
    std::filesystem::remove("/small/filler");
}

TEST_F(AutoConnectFileTest, AListThatCannotBeReadToItsEndIsKept) {
    std::string rest;
    while (rest.size() < 100000)
        rest += ",11:22:33:44:55:66";
    write("1,A" + rest);
    readableUpTo = 8000; // the flag and the first entries
    EXPECT_FALSE(config.removeDevice(adapter, "A"));
    readableUpTo = std::numeric_limits<off_t>::max();
    EXPECT_EQ(log.take(),
              Texts{inAutoConnect("Config '" + file + "' can not be read to its end.")});
    EXPECT_TRUE(content() == "1,A" + rest);
    EXPECT_EQ(pipe.take(), "");
    EXPECT_TRUE(config.removeDevice(adapter, "A"));
    EXPECT_TRUE(content() == "1" + rest);
}

TEST_F(AutoConnectFileTest, ListsAreReadWithoutChangeAndChangedWhateverTheirFlag) {
    AutoConnect::List list{true, {"X"}};
    EXPECT_TRUE(config.readList(adapter, list)) << "there is none";
    EXPECT_FALSE(list.isEnabled);
    EXPECT_EQ(list.devices, Texts());
    EXPECT_FALSE(std::filesystem::exists(configFolder));

    const std::tuple<const char*, const char*> cases[] = {
        {"", "0,A"}, {"0", "0,A"}, {"0,", "0,A"}, {"1", "1,A"}, {"1,B,,C,", "1,B,,C,A"}};
    for (const auto& [before, after] : cases) {
        write(before);
        EXPECT_TRUE(config.changeList(
            adapter, [](AutoConnect::List& changed) { changed.devices.emplace_back("A"); }));
        EXPECT_EQ(content(), after);
        EXPECT_EQ(pipe.take(), "1");
    }
    pid_t forked = -1;
    const auto fail = [&](AutoConnect::List&) {
        forked = fork();
        while (forked == 0)
            pause();
        throw std::logic_error("no");
    };
    EXPECT_THROW(config.changeList(adapter, fail), std::logic_error);
    EXPECT_EQ(content(), "1,B,,C,A");
    EXPECT_TRUE(config.set(adapter, false, "")) << "nothing is locked, nor by the other process";
    kill(forked, SIGKILL);
    waitpid(forked, nullptr, 0);
}

TEST_F(AutoConnectFileTest, AChangeWaitsForTheEndOfTheOneBeforeIt) {
    write("1,A,B");
    std::thread other;
    std::atomic<bool> isOtherDone{false};
    EXPECT_TRUE(config.changeList(adapter, [&](AutoConnect::List& list) {
        other = std::thread([&] {
            EXPECT_TRUE(config.removeDevice(adapter, "A"));
            isOtherDone = true;
        });
        EXPECT_TRUE(becomesTrue([&] {
            return isOtherDone || readFile("/proc/locks").find("-> FLOCK") != std::string::npos;
        })) << "it waits, which the system knows";
        list.devices.emplace_back("C");
    }));
    other.join();
    EXPECT_EQ(content(), "1,B,C");
}

TEST_F(AutoConnectFileTest, AReplacedFileKeepsItsOwnerItsModeAndTheLinkToIt) {
    const auto statusOf = [this] {
        struct stat status {};
        stat(file.c_str(), &status);
        return status;
    };
    const std::string lock = std::string(configFolder) + ".lock";
    write("1,A");
    writeFile("/tmp/precious", "kept");
    std::filesystem::create_symlink("/tmp/precious", lock);
    std::filesystem::permissions("/tmp/precious", std::filesystem::perms(0666));
    std::filesystem::permissions(file, std::filesystem::perms(0640));
    const bool isRoot = geteuid() == 0;
    if (isRoot) {
        ASSERT_EQ(chown(file.c_str(), 1234, 1235), 0);
    }
    const struct stat old = statusOf();
    const auto expectKept = [&](const char* list, bool isReplaced) {
        EXPECT_EQ(content(), list);
        const struct stat now = statusOf();
        EXPECT_EQ(now.st_ino != old.st_ino, isReplaced);
        EXPECT_EQ(std::tuple(now.st_mode, now.st_uid, now.st_gid),
                  std::tuple(old.st_mode, old.st_uid, old.st_gid));
    };
    if (isRoot) { // who may write the file, and nothing beside it
        std::filesystem::create_hard_link(file, "/etc/other-name");
        for (const bool hasOneName : {false, true}) {
            ASSERT_EQ(seteuid(1234), 0);
            EXPECT_EQ(config.set(adapter, true, ",B"), hasOneName);
            ASSERT_EQ(seteuid(0), 0);
            std::filesystem::remove("/etc/other-name");
        }
        expectKept("1,B", false);
    }
    EXPECT_TRUE(config.set(adapter, true, ",C")) << "a link is no lock";
    expectKept("1,C", true);
    EXPECT_EQ(readFile("/tmp/precious"), "kept");

    std::filesystem::remove(lock);
    std::filesystem::rename(file, "/etc/bluetooth/list");
    std::filesystem::create_symlink("../list", file);
    EXPECT_TRUE(config.removeDevice(adapter, "C"));
    expectKept("1", true);
    if (isRoot) {
        ASSERT_EQ(lchown(file.c_str(), 1234, 1234), 0);
        EXPECT_FALSE(config.set(adapter, true, ",D")) << "another user chose the file";
    }
    EXPECT_EQ(readFile("/etc/bluetooth/list"), "1");
    struct stat status {};
    ASSERT_EQ(lstat(lock.c_str(), &status), 0);
    EXPECT_EQ(status.st_mode, static_cast<mode_t>(S_IFREG | 0600)) << "users cannot hold it";
    if (isRoot)
        log.take(); // another user may not use the pipe
    EXPECT_EQ(log.take(), Texts());
}

TEST_F(AutoConnectFileTest, AProcessThatIsKilledWhileItChangesAListLosesNothing) {
    constexpr int devices = 200;
    std::string list = "1";
    for (int i = 0; i < devices; ++i)
        list += ",00:11:22:33:44:55";
    write(list);
    const std::string longer = list + ",X";
    std::minstd_rand random(1);
    for (int kills = soakCount(1000, 50); kills > 0 && !HasFailure(); --kills) {
        const pid_t changing = fork();
        ASSERT_GE(changing, 0);
        while (changing == 0) {
            config.set(adapter, true, longer.c_str() + 1);
            config.removeDevice(adapter, "X");
        }
        usleep(static_cast<useconds_t>(random() % 3000)); // at any moment
        kill(changing, SIGKILL);
        waitpid(changing, nullptr, 0);
        const std::string left = content();
        EXPECT_TRUE(left == list || left == longer) << left;
    }
    for (const auto& entry : std::filesystem::directory_iterator(configFolder))
        last_write_time(entry, entry.last_write_time() - std::chrono::seconds(11));
    writeFile(std::string(configFolder) + ".tmp-" + adapter + "-1", "may be being written");
    EXPECT_TRUE(config.set(adapter, false, ""));
    EXPECT_EQ(std::distance(std::filesystem::directory_iterator(configFolder), {}), 3)
        << "that, the list and its lock";
}

TEST_F(AutoConnectFileTest, AHugeFileIsNotReadAndKept) {
    write("1,A,B");
    std::filesystem::resize_file(file, std::uintmax_t(100) << 30); // a hole, and no comma in it
    EXPECT_FALSE(config.getEnable(adapter));
    EXPECT_FALSE(config.removeDevice(adapter, "A"));
    EXPECT_EQ(log.take(), Texts(2, inAutoConnect("Config '" + file + "' is too large.")));
    EXPECT_EQ(std::filesystem::file_size(file), std::uintmax_t(100) << 30);
    EXPECT_TRUE(config.set(adapter, true, ",A")) << "and it can be replaced";
    EXPECT_EQ(content(), "1,A");
}

} // namespace Bluetooth::Test

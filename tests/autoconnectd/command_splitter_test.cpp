// SPDX-License-Identifier: LGPL-2.1-or-later
#include "command_splitter.h"

#include <gtest/gtest.h>

#include <tuple>

namespace AutoConnectd::Test {

namespace {

/// The commands as one letter each.
std::string feed(CommandSplitter& splitter, std::string_view bytes) {
    std::string letters;
    for (const Command command : splitter.feed(bytes))
        letters += command == Command::Reload ? '1' : command == Command::Pause ? 'p' : 'r';
    return letters;
}

} // namespace

TEST(CommandSplitterTest, TellsCommandsApartThatRunTogetherInPiecesOfAnySize) {
    const std::tuple<std::string, const char*, const char*> cases[] = {
        {"1", "1", ""},
        {"1pause1", "1p1", ""},
        {"pauseresume11", "pr11", ""},
        {"resumepauseresume", "rpr", ""},
        {"1\npause\r\n 1\t", "1p1", ""},
        {std::string("1\0pause\0", 8), "1p", ""},
        {"ppause", "p", "p"},
        {"paupause1", "p1", "pau"},
        {"rerresume", "r", "rer"},
        {"stop1PAUSE", "1", "stopPAUSE"},
        {"pa use1", "1", "pause"}, // a command has no space within
    };
    for (const auto& [bytes, commands, unknown] : cases) {
        for (std::size_t size = 1; size <= bytes.size(); ++size) {
            CommandSplitter splitter;
            std::string found;
            for (std::size_t from = 0; from < bytes.size(); from += size)
                found += feed(splitter, std::string_view(bytes).substr(from, size));
            EXPECT_EQ(found, commands) << bytes << " by " << size;
            EXPECT_EQ(splitter.takeUnknown(), unknown) << bytes << " by " << size;
            EXPECT_EQ(splitter.takeUnknown(), "");
        }
    }
}

TEST(CommandSplitterTest, MemoryIsBoundedByWhatIsNotTaken) {
    CommandSplitter splitter;
    EXPECT_EQ(feed(splitter, std::string(100000, 'p')), "");
    EXPECT_EQ(splitter.takeUnknown().size(), 99999u);
    EXPECT_EQ(feed(splitter, "ause"), "p");
}

} // namespace AutoConnectd::Test

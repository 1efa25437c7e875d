// SPDX-License-Identifier: LGPL-2.1-or-later
// Any content of an auto-connect file, read in each way.

#include "host/auto_connect_file.h"

#include <fcntl.h>
#include <sys/mman.h>
#include <unistd.h>

#include <cstdint>
#include <cstdlib>

using namespace Bluetooth;

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    static const int descriptor = memfd_create("auto-connect", MFD_CLOEXEC);
    static const std::string path = "/proc/self/fd/" + std::to_string(descriptor);
    if (ftruncate(descriptor, 0) != 0 ||
        pwrite(descriptor, data, size, 0) != static_cast<ssize_t>(size))
        abort();
    const AutoConnectFile file(path, O_RDONLY);
    if (!file.isOpen() || !file.isComplete())
        abort();
    if (file.readsEnabled() && !file.readsNonZero())
        abort(); // "1" is not 0
    std::size_t read = 2;
    std::vector<std::string> entries = file.entries();
    for (const std::string& entry : entries) {
        if (entry.find(',') != std::string::npos)
            abort();
        read += entry.size() + 1;
    }
    if (size > 2 && read != size + (data[size - 1] == ',' ? 0 : 1))
        abort(); // a byte is lost, or made up
    // What is written is read back, but for a last entry without text.
    while (!entries.empty() && entries.back().empty())
        entries.pop_back();
    const std::string written = contentOf({true, entries});
    if (ftruncate(descriptor, 0) != 0 || pwrite(descriptor, written.data(), written.size(), 0) !=
                                             static_cast<ssize_t>(written.size()))
        abort();
    if (const AutoConnectFile again(path, O_RDONLY);
        !again.readsEnabled() || again.entries() != entries)
        abort();
    return 0;
}

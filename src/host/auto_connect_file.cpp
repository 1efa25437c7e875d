// SPDX-License-Identifier: LGPL-2.1-or-later
#include "host/auto_connect_file.h"

#include "core/descriptor.h"

#include <fcntl.h>
#include <sys/stat.h>

#include <cstdio>
#include <locale>
#include <sstream>

namespace Bluetooth {

namespace {

constexpr std::size_t maxSize = 1 << 20;
constexpr std::size_t firstEntry = 2; // after the flag and one comma, whatever they are
constexpr char separator = ',';

/// Reads the value at the beginning of a text.
template <class Value>
bool readsAs(const std::string& content, Value& value) {
    std::istringstream stream(content);
    // Where the program's locale groups digits by commas, "1,112" would be read as one number.
    stream.imbue(std::locale::classic());
    return static_cast<bool>(stream >> value);
}

} // namespace

std::string autoConnectPath(const char* adapter) {
    return std::string(autoConnectFolder) + adapter;
}

AutoConnectFile::AutoConnectFile(const std::string& path, int access) {
    const Descriptor file(open(path.c_str(), access | O_NONBLOCK | O_CLOEXEC));
    struct stat status {};
    if (!file.isOpen() || fstat(file.number(), &status) != 0)
        m_error = errno;
    else if (!S_ISREG(status.st_mode))
        m_error = S_ISDIR(status.st_mode) ? EISDIR : EINVAL;
    m_isOpen = m_error == 0;
    m_isTooLarge = m_isOpen && status.st_size > static_cast<off_t>(maxSize);
    if (m_isTooLarge)
        m_error = EFBIG;
    else if (m_isOpen)
        m_error = read(file.number());
}

int AutoConnectFile::read(int descriptor) {
    char bytes[4096];
    for (;;) {
        const ssize_t length = ::read(descriptor, bytes, sizeof bytes);
        if (length < 0 && errno == EINTR)
            continue;
        if (length <= 0)
            return length < 0 ? errno : 0;
        m_content.append(bytes, static_cast<std::size_t>(length));
        m_isTooLarge = m_content.size() > maxSize; // it grows
        if (m_isTooLarge)
            return EFBIG;
    }
}

bool AutoConnectFile::readsNonZero() const {
    int number = 0;
    return readsAs(m_content, number) && number != 0;
}

bool AutoConnectFile::readsEnabled() const {
    bool flag = false;
    return readsAs(m_content, flag) && flag;
}

std::vector<std::string> AutoConnectFile::entries() const {
    std::vector<std::string> entries;
    for (std::size_t begin = firstEntry; begin < m_content.size();) {
        const std::size_t end = m_content.find(separator, begin);
        entries.push_back(m_content.substr(begin, end - begin));
        if (end == std::string::npos)
            break;
        begin = end + 1;
    }
    return entries;
}

std::string contentOf(const AutoConnect::List& list) {
    std::string content = list.isEnabled ? "1" : "0";
    for (const std::string& device : list.devices)
        content += separator + device;
    return content;
}

std::string shownEntry(const std::string& entry) {
    constexpr std::size_t maxShown = 64;
    std::string shown;
    for (const char character : entry.substr(0, maxShown)) {
        char escape[8] = {character};
        if (character < ' ' || character > '~' || character == '\\')
            static_cast<void>(std::snprintf(escape, sizeof escape, "\\x%02x",
                                            static_cast<unsigned char>(character)));
        shown += escape;
    }
    return entry.size() > maxShown ? shown + "..." : shown;
}

} // namespace Bluetooth

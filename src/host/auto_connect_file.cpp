// SPDX-License-Identifier: LGPL-2.1-or-later
#include "host/auto_connect_file.h"

#include <locale>

namespace Bluetooth {

namespace {

constexpr std::streamoff maxSize = 1 << 20;
constexpr std::streamoff firstEntry = 2; // after the flag and one comma, whatever they are
constexpr char separator = ',';

} // namespace

std::string autoConnectPath(const char* adapter) {
    return std::string(autoConnectFolder) + adapter;
}

AutoConnectFile::AutoConnectFile(const std::string& path, std::ios::openmode mode)
    : m_file(path, mode | std::ios::binary) {
    // Where the program's locale groups digits by commas, "1,112" would be read as one number.
    m_file.imbue(std::locale::classic());
}

bool AutoConnectFile::isTooLarge() {
    m_file.clear();
    m_file.seekg(0, std::ios::end);
    const bool tooLarge = m_file.tellg() > maxSize;
    m_file.seekg(0);
    return tooLarge;
}

bool AutoConnectFile::readsNonZero() {
    m_file.clear();
    m_file.seekg(0);
    int number = 0;
    return (m_file >> number) && number != 0;
}

bool AutoConnectFile::readsEnabled() {
    m_file.clear();
    m_file.seekg(0);
    bool flag = false;
    return (m_file >> flag) && flag;
}

std::vector<std::string> AutoConnectFile::readEntries() {
    m_file.clear();
    m_complete = false;
    std::vector<std::string> entries;
    try {
        // Without this the stream keeps a lack of memory to itself, and a list that is cut short
        // would be written back so.
        m_file.exceptions(std::ios::badbit);
        m_file.seekg(firstEntry);
        while (m_file.peek() != std::fstream::traits_type::eof()) {
            std::string entry;
            std::getline(m_file, entry, separator);
            entries.push_back(std::move(entry));
        }
        m_complete = true;
    } catch (const std::ios_base::failure&) {
        // The disk failed: the entries before that.
    }
    m_file.exceptions(std::ios::goodbit);
    return entries;
}

std::string listWithout(const std::vector<std::string>& entries, const std::string& device) {
    std::string list;
    for (const std::string& entry : entries) {
        if (entry != device)
            list += separator + entry;
    }
    return list;
}

bool writeAutoConnectFile(std::ofstream& file, const std::string& content) {
    file << content;
    file.close();
    return !file.fail();
}

} // namespace Bluetooth

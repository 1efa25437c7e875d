// SPDX-License-Identifier: LGPL-2.1-or-later
#include "host/file_place.h"

#include <fcntl.h>
#include <limits.h>
#include <sys/stat.h>

#include <cerrno>

namespace Bluetooth {

namespace {

constexpr int maxLinks = 40; // as the system has it
constexpr int toLookAt = O_PATH | O_NOFOLLOW | O_CLOEXEC;

std::unique_ptr<Descriptor> openFolder(const char* path) {
    return std::make_unique<Descriptor>(open(path, toLookAt | O_DIRECTORY));
}

/// Takes the first name off a path. @return "" when there is none left
std::string takeName(std::string& path) {
    path.erase(0, path.find_first_not_of('/'));
    std::string name = path.substr(0, path.find('/'));
    path.erase(0, name.size());
    return name;
}

/// Puts where a link leads in front of the rest of the path.
/// @param links how many it makes @return false with errno set
bool follow(int link, const struct stat& status, int links, std::string& rest) {
    if (links > maxLinks || (status.st_uid != 0 && status.st_uid != geteuid())) {
        errno = ELOOP;
        return false;
    }
    char target[PATH_MAX];
    const ssize_t length = readlinkat(link, "", target, sizeof target);
    if (length <= 0)
        return false;
    rest.insert(0, target, static_cast<std::size_t>(length));
    return true;
}

} // namespace

std::unique_ptr<FilePlace> findPlace(const std::string& path, bool mayBeMissing) {
    std::string rest = path;
    int links = 0;
    auto folder = openFolder(path.rfind('/', 0) == 0 ? "/" : ".");
    while (folder->isOpen()) {
        std::string name = takeName(rest);
        auto entry = std::make_unique<Descriptor>(openat(folder->number(), name.c_str(), toLookAt));
        const bool isLast = rest.find_first_not_of('/') == std::string::npos;
        if (!entry->isOpen() && errno == ENOENT && isLast && mayBeMissing)
            return std::make_unique<FilePlace>(FilePlace{std::move(folder), std::move(name)});
        struct stat status {};
        if (!entry->isOpen() || fstat(entry->number(), &status) != 0)
            break;
        if (S_ISLNK(status.st_mode)) {
            if (!follow(entry->number(), status, ++links, rest))
                break;
            if (rest.front() == '/')
                folder = openFolder("/");
        } else if (isLast) {
            return std::make_unique<FilePlace>(FilePlace{std::move(folder), std::move(name)});
        } else {
            folder = std::move(entry);
        }
    }
    return nullptr;
}

} // namespace Bluetooth

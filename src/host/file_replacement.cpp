// SPDX-License-Identifier: LGPL-2.1-or-later
#include "host/file_replacement.h"

#include "core/descriptor.h"
#include "host/file_place.h"

#include <dirent.h>
#include <fcntl.h>
#include <sys/random.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cstdio>
#include <cstring>
#include <ctime>
#include <memory>

namespace Bluetooth {

namespace {

constexpr mode_t permissions = 0777;

bool writeAll(int file, const std::string& content) {
    for (std::size_t done = 0; done < content.size();) {
        const ssize_t written = write(file, content.data() + done, content.size() - done);
        if (written < 0 && errno != EINTR)
            return false;
        done += written < 0 ? 0 : static_cast<std::size_t>(written);
    }
    return true;
}

/// Some file systems have nothing to wait for, and say so.
bool reachesTheDisk(int file) {
    return fsync(file) == 0 || errno == EINVAL;
}

/// Whether a new file cannot be made, or not take the old one's place, where the old one may all
/// the same be writable. A lack of space is no such thing: the old content would be lost too.
bool preventsNewFile(int error) {
    return error == EACCES || error == EPERM || error == EROFS || error == EBUSY ||
           error == ENAMETOOLONG || error == EINVAL; // an owner that the file system cannot have
}

/// A program that cannot have the lock may be writing one: that takes no time.
bool isLeftover(int folder, const char* name) {
    constexpr time_t longestWrite = 10;
    struct stat status {};
    return fstatat(folder, name, &status, AT_SYMLINK_NOFOLLOW) == 0 &&
           time(nullptr) - status.st_mtime > longestWrite;
}

void removeLeftovers(int folder, const std::string& prefix) {
    const int copy = openat(folder, ".", O_RDONLY | O_DIRECTORY | O_CLOEXEC);
    const std::unique_ptr<DIR, int (*)(DIR*)> names(copy < 0 ? nullptr : fdopendir(copy), closedir);
    if (!names && copy >= 0)
        close(copy);
    while (const dirent* entry = names ? readdir(names.get()) : nullptr) {
        if (strncmp(prefix.c_str(), entry->d_name, prefix.size()) == 0 &&
            isLeftover(folder, entry->d_name))
            unlinkat(folder, entry->d_name, 0);
    }
}

/// @param made receives its name
/// @return its descriptor, or -1 with errno set
int makeFile(int folder, const std::string& prefix, std::string& made) {
    int file = -1;
    do {
        unsigned number = 0;
        if (getrandom(&number, sizeof number, 0) < 0)
            return -1;
        made = prefix + std::to_string(number);
        file = openat(folder, made.c_str(), O_WRONLY | O_CREAT | O_EXCL | O_CLOEXEC,
                      S_IRUSR | S_IWUSR);
    } while (file < 0 && errno == EEXIST);
    return file;
}

/// The new file, in the place of the old one.
bool fillAndRename(int folder, int file, const std::string& made, const std::string& name,
                   const std::string& content) {
    struct stat old {};
    if (fstatat(folder, name.c_str(), &old, AT_SYMLINK_NOFOLLOW) != 0)
        return false;
    if (!S_ISREG(old.st_mode)) {
        errno = EINVAL;
        return false;
    }
    return fchown(file, old.st_uid, old.st_gid) == 0 &&
           fchmod(file, old.st_mode & permissions) == 0 && writeAll(file, content) &&
           reachesTheDisk(file) && renameat(folder, made.c_str(), folder, name.c_str()) == 0;
}

/// @return 0 or an error
int replace(const FilePlace& place, const std::string& content, bool isAlone) {
    const Descriptor directory(
        openat(place.folder->number(), ".", O_RDONLY | O_DIRECTORY | O_CLOEXEC));
    if (!directory.isOpen())
        return errno;
    const int folder = directory.number();
    const std::string prefix = ".tmp-" + place.name + "-";
    if (isAlone)
        removeLeftovers(folder, prefix);
    std::string made;
    const Descriptor file(makeFile(folder, prefix, made));
    if (!file.isOpen())
        return errno;
    if (!fillAndRename(folder, file.number(), made, place.name, content)) {
        const int error = errno;
        unlinkat(folder, made.c_str(), 0);
        return error;
    }
    return reachesTheDisk(folder) ? 0 : errno;
}

/// Only a file that has no other name, which may be somebody else's, and opened so that what has
/// come into its place cannot hold the program.
Replacement overwrite(const FilePlace& place, const std::string& content) {
    const Descriptor file(openat(place.folder->number(), place.name.c_str(),
                                 O_WRONLY | O_NOFOLLOW | O_NONBLOCK | O_CLOEXEC));
    struct stat status {};
    if (!file.isOpen() || fstat(file.number(), &status) != 0 || !S_ISREG(status.st_mode) ||
        status.st_nlink > 1)
        return Replacement::NotOpened;
    return ftruncate(file.number(), 0) == 0 && writeAll(file.number(), content) &&
                   reachesTheDisk(file.number())
               ? Replacement::Done
               : Replacement::NotWritten;
}

} // namespace

Replacement replaceFile(const std::string& path, const std::string& content, bool isAlone) {
    const std::unique_ptr<FilePlace> place = findPlace(path);
    if (!place)
        return Replacement::NotOpened;
    const int error = replace(*place, content, isAlone);
    if (error == 0)
        return Replacement::Done;
    return preventsNewFile(error) ? overwrite(*place, content) : Replacement::NotWritten;
}

} // namespace Bluetooth

// SPDX-License-Identifier: LGPL-2.1-or-later
#include "host/file_replacement.h"

#include "core/descriptor.h"

#include <dirent.h>
#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cstdio>
#include <cstdlib>
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
           error == ENAMETOOLONG;
}

void removeLeftovers(const std::string& folder, const std::string& prefix) {
    const std::unique_ptr<DIR, int (*)(DIR*)> names(opendir(folder.c_str()), closedir);
    while (const dirent* entry = names ? readdir(names.get()) : nullptr) {
        if (prefix.compare(0, std::string::npos, entry->d_name, prefix.size()) == 0)
            unlinkat(dirfd(names.get()), entry->d_name, 0);
    }
}

/// The new file, in the place of the old one.
bool fillAndRename(int file, const std::string& made, const std::string& target,
                   const std::string& content) {
    struct stat old {};
    if (lstat(target.c_str(), &old) != 0 || !S_ISREG(old.st_mode))
        return false;
    return fchown(file, old.st_uid, old.st_gid) == 0 &&
           fchmod(file, old.st_mode & permissions) == 0 && writeAll(file, content) &&
           reachesTheDisk(file) && rename(made.c_str(), target.c_str()) == 0;
}

/// @return 0 or an error
int replace(const std::string& folder, const std::string& target, const std::string& content,
            bool isAlone) {
    const Descriptor directory(open(folder.c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC));
    if (!directory.isOpen())
        return errno;
    const std::string prefix = ".tmp-" + target.substr(folder.size()) + "-";
    if (isAlone)
        removeLeftovers(folder, prefix);
    std::string made = folder + prefix + "XXXXXX";
    const Descriptor file(mkostemp(made.data(), O_CLOEXEC));
    if (!file.isOpen())
        return errno;
    if (!fillAndRename(file.number(), made, target, content)) {
        const int error = errno;
        unlink(made.c_str());
        return error;
    }
    return reachesTheDisk(directory.number()) ? 0 : errno;
}

Replacement overwrite(const std::string& target, const std::string& content) {
    const Descriptor file(open(target.c_str(), O_WRONLY | O_TRUNC | O_NOFOLLOW | O_CLOEXEC));
    if (!file.isOpen())
        return Replacement::NotOpened;
    return writeAll(file.number(), content) && reachesTheDisk(file.number())
               ? Replacement::Done
               : Replacement::NotWritten;
}

} // namespace

Replacement replaceFile(const std::string& path, const std::string& content, bool isAlone) {
    const std::unique_ptr<char, decltype(&free)> resolved(realpath(path.c_str(), nullptr), free);
    if (!resolved)
        return Replacement::NotOpened;
    const std::string target = resolved.get();
    const std::string folder = target.substr(0, target.rfind('/') + 1);
    const int error = replace(folder, target, content, isAlone);
    if (error == 0)
        return Replacement::Done;
    return preventsNewFile(error) ? overwrite(target, content) : Replacement::NotWritten;
}

} // namespace Bluetooth

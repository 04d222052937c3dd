#include "util/Pathname.h"

// The operations of Pathname that act on a file: one system call each.

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cstdio>

#include "util/Assert.h"
#include "util/FileDescriptor.h"

bool Pathname::stat(struct stat* result) const {
    return ::stat(c_str(), result) == 0;
}

bool Pathname::isDir() const {
    struct stat info;
    return stat(&info) && S_ISDIR(info.st_mode);
}

bool Pathname::isReg() const {
    struct stat info;
    return stat(&info) && S_ISREG(info.st_mode);
}

bool Pathname::getMtime(long* mtime) const {
    struct stat info;
    if (!stat(&info)) {
        return false;
    }
    *mtime = static_cast<long>(info.st_mtime);
    return true;
}

bool Pathname::getSize(long long* size) const {
    struct stat info;
    if (!stat(&info)) {
        return false;
    }
    *size = info.st_size;
    return true;
}

bool Pathname::exists() const {
    return ::access(c_str(), F_OK) == 0;
}

bool Pathname::r_ok() const {
    return ::access(c_str(), R_OK) == 0;
}

bool Pathname::w_ok() const {
    return ::access(c_str(), W_OK) == 0;
}

bool Pathname::rw_ok() const {
    return ::access(c_str(), R_OK | W_OK) == 0;
}

std::FILE* Pathname::fopen(const char* mode) const {
    return ::fopen(c_str(), mode);
}

bool Pathname::mkdir(MkdirMode mode) const {
    mode_t permissions = 0700;
    if (mode == MKDIR_GROUP_RW) {
        permissions = 0770;
    } else if (mode == MKDIR_PUBLIC) {
        permissions = 0777;
    } else if (mode == MKDIR_WORLD_READ) {
        permissions = 0755;
    } else {
        QUELTA_ASSERT(mode == MKDIR_PRIVATE);
    }
    return ::mkdir(c_str(), permissions) == 0;
}

bool Pathname::rmdir() const {
    return ::rmdir(c_str()) == 0;
}

bool Pathname::unlink() const {
    return ::unlink(c_str()) == 0;
}

bool Pathname::remove() const {
    return ::remove(c_str()) == 0;
}

bool Pathname::truncate(long long length) const {
    return ::truncate(c_str(), length) == 0;
}

bool Pathname::readlink(char* buf, unsigned long size) const {
    return ::readlink(c_str(), buf, size) == 0;
}

bool Pathname::symlinkTo(const Pathname& link) const {
    return ::symlink(c_str(), link.c_str()) == 0;
}

bool Pathname::renameTo(const Pathname& dest) const {
    return ::rename(c_str(), dest.c_str()) == 0;
}

FileDescriptor Pathname::openReadOnly() const {
    return ::open(c_str(), O_RDONLY);
}

FileDescriptor Pathname::openReadOnlySafer() const {
    return ::open(c_str(), O_RDONLY | O_NONBLOCK);
}

FileDescriptor Pathname::openCreateOnly(CreateMode mode) const {
    return ::open(c_str(), O_WRONLY | O_CREAT | O_EXCL, createmode_to_perm(mode));
}

FileDescriptor Pathname::openCreateOrReplace(CreateMode mode) const {
    return ::open(c_str(), O_WRONLY | O_CREAT | O_TRUNC, createmode_to_perm(mode));
}

FileDescriptor Pathname::openCreateOrReplace(FileDescriptor model) const {
    struct stat info;
    if (!model.stat(&info)) {
        return -1;
    }
    return ::open(c_str(), O_WRONLY | O_CREAT | O_TRUNC, info.st_mode & 0777);
}

FileDescriptor Pathname::openCreateOrAppend(CreateMode mode) const {
    return ::open(c_str(), O_WRONLY | O_CREAT | O_APPEND, createmode_to_perm(mode));
}

FileDescriptor Pathname::openReadWriteOrCreate(CreateMode mode) const {
    return ::open(c_str(), O_RDWR | O_CREAT | O_TRUNC, createmode_to_perm(mode));
}

bool Pathname::copyTo(const Pathname& dest) const {
    const ScopedFileDescriptor source(*this);
    return source.copyTo(dest);
}

mode_t createmode_to_perm(Pathname::CreateMode mode) noexcept {
    switch (mode) {
        case Pathname::CREATE_PRIVATE:
            return 0600;
        case Pathname::CREATE_READABLE_NONPUBLIC:
            return 0440;
        case Pathname::CREATE_NORMAL:
            break;
    }
    return 0644;
}

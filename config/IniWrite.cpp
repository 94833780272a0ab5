// Writing the store: to a file through a temporary file renamed over the target, or to an
// open stream; and the change check of the remembered file. The temporary file gets the
// target's mode (0644 for a new file) before any data goes into it.
#include "config/IniModel.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>
#include <memory>
#include <vector>

namespace {

struct FileCloser {
    void operator()(FILE* file) const { std::fclose(file); }
};
using File = std::unique_ptr<FILE, FileCloser>;

// Removes a file when it goes out of scope, unless released.
class RemoveOnExit {
public:
    explicit RemoveOnExit(std::string path) : m_path(std::move(path)) {}
    ~RemoveOnExit() {
        if (!m_path.empty()) {
            ::unlink(m_path.c_str());
        }
    }
    RemoveOnExit(const RemoveOnExit&) = delete;
    RemoveOnExit& operator=(const RemoveOnExit&) = delete;
    void Release() { m_path.clear(); }

private:
    std::string m_path;
};

std::string DirectoryOf(const std::string& path) {
    size_t slash = path.rfind('/');
    return slash == std::string::npos ? std::string() : path.substr(0, slash + 1);
}

// The target with its extension replaced by "TMP", or ".TMP" appended.
std::string TmpExtensionName(const std::string& path) {
    size_t dot = path.rfind('.');
    size_t slash = path.rfind('/');
    bool hasExtension = dot != std::string::npos && (slash == std::string::npos || dot > slash);
    if (hasExtension && path.compare(dot + 1, std::string::npos, "TMP") != 0) {
        return path.substr(0, dot + 1) + "TMP";
    }
    return path + ".TMP";
}

// The target must be writable: create and remove it, or open it for update.
int TestTarget(const char* path, bool exists) {
    File file(std::fopen(path, exists ? "r+be" : "wbe"));
    if (!file) {
        return kIniCannotReplace;
    }
    file.reset();
    if (!exists) {
        ::unlink(path);
    }
    return 0;
}

// Opens the file the data goes into, with its final mode and owner already set.
int OpenOutput(const IniStore& store, const std::string& target, const struct stat* before,
               std::string* written, File* file) {
    const uint32_t flags = store.writeFlags;
    const mode_t mode = before ? (before->st_mode & 07777) : 0644;
    int fd = -1;
    if ((flags & kIniWriteViaTemp) && (flags & kIniWriteMkstemp)) {
        std::string name = DirectoryOf(target) + "ini$$.TMPXXXXXX";
        std::vector<char> templ(name.begin(), name.end());
        templ.push_back('\0');
        fd = ::mkostemp(templ.data(), O_CLOEXEC);
        if (fd < 0) {
            return kIniNoTempFile;
        }
        written->assign(templ.data());
    } else if (flags & kIniWriteViaTemp) {
        *written = TmpExtensionName(target);
        fd = ::open(written->c_str(), O_WRONLY | O_CREAT | O_TRUNC | O_CLOEXEC, mode);
        if (fd < 0) {
            written->clear();
            return kIniCannotCreate;
        }
    } else {
        *written = target;
        file->reset(std::fopen(target.c_str(), "wbe"));
        return *file ? 0 : kIniCannotCreate;
    }
    if (before && ::fchown(fd, before->st_uid, before->st_gid) != 0) {
        // Only the owner's own files can be given away; the mode still protects the data.
    }
    ::fchmod(fd, mode);
    file->reset(::fdopen(fd, "wb"));
    if (!*file) {
        ::close(fd);
        return kIniCannotCreate;
    }
    return 0;
}

void SyncDirectory(const std::string& target) {
    std::string directory = DirectoryOf(target);
    int fd =
        ::open(directory.empty() ? "." : directory.c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC);
    if (fd >= 0) {
        ::fsync(fd);
        ::close(fd);
    }
}

int WriteFile(IniStore* store, const std::string& target) {
    std::string text;
    int rc = qv_ini::Serialize(*store, &text);
    if (rc < 0) {
        return rc;
    }
    const uint32_t flags = store->writeFlags;
    const bool viaTemp = (flags & kIniWriteViaTemp) != 0;
    struct stat before;
    const bool existed = ::stat(target.c_str(), &before) == 0;
    if (viaTemp && (rc = TestTarget(target.c_str(), existed)) < 0) {
        return rc;
    }
    std::string written;
    File file;
    rc = OpenOutput(*store, target, existed ? &before : nullptr, &written, &file);
    RemoveOnExit temporary(viaTemp ? written : std::string());
    if (rc < 0) {
        return rc;
    }
    bool ok = std::fwrite(text.data(), 1, text.size(), file.get()) == text.size() &&
              std::fflush(file.get()) == 0;
    if (ok && (flags & kIniWriteSync)) {
        ok = ::fsync(fileno(file.get())) == 0;
    }
    ok = (std::fclose(file.release()) == 0) && ok;
    if (!ok) {
        return kIniWriteFailed;
    }
    if (viaTemp) {
        const bool exists = ::stat(target.c_str(), &before) == 0;
        if (::rename(written.c_str(), target.c_str()) != 0) {
            return kIniCannotReplace;
        }
        temporary.Release();
        if (exists) {
            if (::chown(target.c_str(), before.st_uid, before.st_gid) != 0) {
                // Not ours to give away: the file keeps the writer's owner.
            }
            ::chmod(target.c_str(), before.st_mode & 07777);
        }
        if (flags & kIniWriteSync) {
            SyncDirectory(target);
        }
    }
    struct stat after;
    store->path = target;
    store->modificationTime =
        ::stat(target.c_str(), &after) == 0 ? static_cast<int32_t>(after.st_mtime) : 0;
    return 0;
}

}  // namespace

int IniWriteFile(IniStore* store, const char* path) {
    if (!path || !*path) {
        return kIniInvalid;
    }
    return qv_ini::NoThrow([&] { return WriteFile(store, path); });
}

int IniWriteStream(IniStore* store, FILE* stream, int append) {
    if (!stream) {
        return kIniInvalid;
    }
    if (store->writeFlags & kIniWriteViaTemp) {
        return kIniStreamMisuse;
    }
    return qv_ini::NoThrow([&] {
        std::string text;
        int rc = qv_ini::Serialize(*store, &text);
        if (rc < 0) {
            return rc;
        }
        if (!append) {
            std::fflush(stream);
            if (::ftruncate(fileno(stream), 0) != 0) {
                return (errno == EBADF || errno == EACCES) ? kIniCannotReplace : kIniStreamMisuse;
            }
            if (std::fseek(stream, 0, SEEK_SET) != 0) {
                return kIniStreamMisuse;
            }
        }
        if (std::fwrite(text.data(), 1, text.size(), stream) != text.size() ||
            std::fflush(stream) != 0) {
            return kIniWriteFailed;
        }
        return 0;
    });
}

int IniFileChanged(IniStore* store) {
    if (store->path.empty()) {
        return kIniNoPath;
    }
    struct stat info;
    if (::stat(store->path.c_str(), &info) != 0) {
        return kIniInvalid;
    }
    return static_cast<int32_t>(info.st_mtime) != store->modificationTime ? 1 : 0;
}

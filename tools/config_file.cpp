#include "tools/config_file.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>

namespace xtok::tools {

namespace {

/// Why a file of this kind and size is refused; "" when it is not.
std::string unfit(const std::string& path, const struct stat& info) {
    const char* kind = S_ISDIR(info.st_mode)                            ? "a directory"
                       : S_ISFIFO(info.st_mode)                         ? "a FIFO"
                       : S_ISCHR(info.st_mode) || S_ISBLK(info.st_mode) ? "a device"
                       : S_ISSOCK(info.st_mode)                         ? "a socket"
                       : !S_ISREG(info.st_mode)                         ? "no regular file"
                                                                        : nullptr;
    if (kind) {
        return "the configuration file " + path + " is " + kind + ", not a text file";
    }
    if (static_cast<std::size_t>(info.st_size) > kMaxConfigFile) {
        return "the configuration file " + path + " holds " + std::to_string(info.st_size) +
               " bytes; at most 1 MiB is read";
    }
    return "";
}

std::string cannotRead(const std::string& path) {
    return "cannot read the configuration file " + path + ": " + std::strerror(errno);
}

/// Reads to the end, or one byte past the limit for a file that grew.
bool readAll(int fd, const std::string& path, std::string& text, std::string& error) {
    text.assign(kMaxConfigFile + 1, '\0');
    std::size_t got = 0;
    while (got < text.size()) {
        const ssize_t n = ::read(fd, &text[got], text.size() - got);
        if (n == 0) {
            break;
        }
        if (n < 0 && errno != EINTR) {
            error = cannotRead(path);
            return false;
        }
        got += n > 0 ? static_cast<std::size_t>(n) : 0;
    }
    if (got > kMaxConfigFile) {
        error = "the configuration file " + path + " grew past 1 MiB while it was read";
        return false;
    }
    text.resize(got);
    // The plug-in takes the text up to its first zero byte: the rest would
    // be lost without a word.
    const std::size_t zero = text.find('\0');
    if (zero != std::string::npos) {
        error = "the configuration file " + path + " holds a zero byte at offset " +
                std::to_string(zero) + "; it must be text";
        return false;
    }
    return true;
}

}  // namespace

// Checked by name first, so that nothing is opened that an open could block
// on or change (a FIFO, a tape); checked again on the descriptor, in case
// the name was pointed elsewhere in between.
bool readConfigFile(const std::string& path, std::string& text, std::string& error) {
    struct stat info;
    if (::stat(path.c_str(), &info) != 0) {
        error = cannotRead(path);
        return false;
    }
    if (!(error = unfit(path, info)).empty()) {
        return false;
    }
    const int fd = ::open(path.c_str(), O_RDONLY | O_NONBLOCK | O_NOCTTY | O_CLOEXEC);
    if (fd < 0) {
        error = cannotRead(path);
        return false;
    }
    bool ok = ::fstat(fd, &info) == 0 ? (error = unfit(path, info)).empty()
                                      : (error = cannotRead(path), false);
    ok = ok && readAll(fd, path, text, error);
    ::close(fd);
    return ok;
}

}  // namespace xtok::tools

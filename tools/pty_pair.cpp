#include "tools/pty_pair.h"

#include <fcntl.h>
#include <stdlib.h>
#include <termios.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>

namespace xtok::tools {

namespace {

std::string failure(const char* step) {
    return std::string("cannot set up a pseudo-terminal (") + step + "): " + std::strerror(errno);
}

}  // namespace

PtyPair::PtyPair(int master, int slave, std::string slavePath)
    : master_(master), slave_(slave), slavePath_(std::move(slavePath)) {}

PtyPair::~PtyPair() {
    closeMaster();
    if (slave_ >= 0) {
        ::close(slave_);
    }
}

std::unique_ptr<PtyPair> PtyPair::open(std::string& error) {
    int master = posix_openpt(O_RDWR | O_NOCTTY | O_CLOEXEC | O_NONBLOCK);
    if (master < 0) {
        error = failure("posix_openpt");
        return nullptr;
    }
    char name[128] = {};
    if (grantpt(master) != 0 || unlockpt(master) != 0 ||
        ptsname_r(master, name, sizeof name) != 0) {
        error = failure("ptsname");
        ::close(master);
        return nullptr;
    }
    int slave = ::open(name, O_RDWR | O_NOCTTY | O_CLOEXEC | O_NONBLOCK);
    if (slave < 0) {
        error = failure(name);
        ::close(master);
        return nullptr;
    }
    std::unique_ptr<PtyPair> pair(new PtyPair(master, slave, name));
    // Until the plug-in opens its end and sets it raw, the line discipline
    // would echo the device's bytes back to it and cook them.
    termios raw{};
    if (tcgetattr(slave, &raw) != 0 || (cfmakeraw(&raw), tcsetattr(slave, TCSANOW, &raw)) != 0) {
        error = failure("tcsetattr");
        return nullptr;
    }
    return pair;
}

void PtyPair::closeMaster() {
    if (master_ >= 0) {
        ::close(master_);
        master_ = -1;
    }
}

}  // namespace xtok::tools

#include "host/serial_line.h"

#include <libserialport.h>
#include <linux/serial.h>
#include <signal.h>
#include <sys/ioctl.h>
#include <termios.h>

#include <cerrno>
#include <cstring>

namespace xtok::host {

namespace {

constexpr int32_t kModeRs485 = 1;
constexpr int32_t kModeRs485P = 3;

std::string systemError(const char* what) {
    return std::string(what) + ": " + std::strerror(errno);
}

std::string libserialportError(sp_return result) {
    if (result != SP_ERR_FAIL) {
        return "libserialport refused the settings (code " + std::to_string(result) + ")";
    }
    char* message = sp_last_error_message();
    std::string text = std::string("libserialport: ") + (message ? message : "failure");
    sp_free_error_message(message);
    return text;
}

struct BaudCode {
    int32_t baud;
    speed_t code;
};

// Without termios2 only the classic rates can be set on a device that
// libserialport does not handle.
constexpr BaudCode kBaudCodes[] = {
    {50, B50},           {75, B75},           {110, B110},         {134, B134},
    {150, B150},         {200, B200},         {300, B300},         {600, B600},
    {1200, B1200},       {1800, B1800},       {2400, B2400},       {4800, B4800},
    {9600, B9600},       {19200, B19200},     {38400, B38400},     {57600, B57600},
    {115200, B115200},   {230400, B230400},   {460800, B460800},   {500000, B500000},
    {576000, B576000},   {921600, B921600},   {1000000, B1000000}, {1152000, B1152000},
    {1500000, B1500000}, {2000000, B2000000}, {2500000, B2500000}, {3000000, B3000000},
    {3500000, B3500000}, {4000000, B4000000},
};

bool baudCode(int32_t baud, speed_t& code) {
    for (const BaudCode& entry : kBaudCodes) {
        if (entry.baud == baud) {
            code = entry.code;
            return true;
        }
    }
    return false;
}

tcflag_t parityFlags(int32_t parity) {
    switch (parity) {
        case 1:
            return PARENB;
        case 2:
            return PARENB | PARODD;
        case 3:
            return PARENB | CMSPAR | PARODD;
        case 4:
            return PARENB | CMSPAR;
        default:
            return 0;
    }
}

tcflag_t sizeFlag(int32_t bits) {
    switch (bits) {
        case 5:
            return CS5;
        case 6:
            return CS6;
        case 7:
            return CS7;
        default:
            return CS8;
    }
}

bool sameSettings(const termios& a, const termios& b) {
    return a.c_iflag == b.c_iflag && a.c_oflag == b.c_oflag && a.c_cflag == b.c_cflag &&
           a.c_lflag == b.c_lflag && cfgetispeed(&a) == cfgetispeed(&b) &&
           cfgetospeed(&a) == cfgetospeed(&b) && std::memcmp(a.c_cc, b.c_cc, sizeof a.c_cc) == 0;
}

constexpr sp_parity kParities[] = {SP_PARITY_NONE, SP_PARITY_EVEN, SP_PARITY_ODD, SP_PARITY_MARK,
                                   SP_PARITY_SPACE};

}  // namespace

std::string describeLine(const LineSettings& s) {
    auto named = [](int32_t code, const char* const* names, int32_t count) {
        return code >= 0 && code < count ? std::string(names[code]) : std::to_string(code);
    };
    return std::to_string(s.baud) + "," + named(s.parity, kParityNames, kParityCount) + "," +
           std::to_string(s.bits) + "," + std::to_string(s.stop) + "," +
           named(s.mode, kModeNames, kModeCount);
}

std::string checkSettings(const LineSettings& s) {
    if (s.baud <= 0) {
        return "baud rate " + std::to_string(s.baud) + " is not valid";
    }
    if (s.parity < 0 || s.parity > 4) {
        return "parity code " + std::to_string(s.parity) + " is not valid";
    }
    if (s.bits < 5 || s.bits > 8) {
        return std::to_string(s.bits) + " data bits are not valid";
    }
    if (s.stop != 1 && s.stop != 2) {
        return std::to_string(s.stop) + " stop bits are not valid";
    }
    if (s.mode < 0 || s.mode > 3) {
        return "line mode code " + std::to_string(s.mode) + " is not valid";
    }
    return "";
}

std::string applyWithLibserialport(sp_port* port, const LineSettings& s) {
    sp_port_config* config = nullptr;
    sp_return result = sp_new_config(&config);
    if (result == SP_OK) {
        result = sp_get_config(port, config);
    }
    if (result == SP_OK) {
        sp_set_config_baudrate(config, s.baud);
        sp_set_config_parity(config, kParities[s.parity]);
        sp_set_config_bits(config, s.bits);
        sp_set_config_stopbits(config, s.stop);
        sp_set_config_flowcontrol(config, SP_FLOWCONTROL_NONE);
        result = sp_set_config(port, config);
    }
    sp_free_config(config);
    return result == SP_OK ? "" : libserialportError(result);
}

bool setLineBits(termios& t, const LineSettings& s) {
    speed_t speed;
    if (!baudCode(s.baud, speed) || cfsetispeed(&t, speed) != 0 || cfsetospeed(&t, speed) != 0) {
        return false;
    }
    t.c_cflag &= ~(CSIZE | PARENB | PARODD | CMSPAR | CSTOPB);
    t.c_cflag |= sizeFlag(s.bits) | parityFlags(s.parity) | (s.stop == 2 ? CSTOPB : 0);
    return true;
}

std::string applyWithTermios(int fd, const LineSettings& s) {
    termios t;
    if (tcgetattr(fd, &t) != 0) {
        return systemError("tcgetattr");
    }
    if (!setLineBits(t, s)) {
        return "baud rate " + std::to_string(s.baud) + " is not supported by this device";
    }
    return tcsetattr(fd, TCSANOW, &t) == 0 ? "" : systemError("tcsetattr");
}

std::string makeRaw(int fd) {
    termios t;
    if (tcgetattr(fd, &t) != 0) {
        return systemError("not a serial device (tcgetattr)");
    }
    cfmakeraw(&t);
    t.c_cflag |= CLOCAL | CREAD;
    t.c_cflag &= ~CRTSCTS;
    t.c_iflag &= ~(IXON | IXOFF | IXANY);
    return tcsetattr(fd, TCSANOW, &t) == 0 ? "" : systemError("tcsetattr");
}

std::string applyLineMode(int fd, int32_t mode) {
    bool wanted = mode == kModeRs485 || mode == kModeRs485P;
    serial_rs485 rs485;
    std::memset(&rs485, 0, sizeof rs485);
    if (ioctl(fd, TIOCGRS485, &rs485) != 0) {
        return wanted ? "the driver has no RS-485 mode" : "";
    }
    rs485.flags &= ~(SER_RS485_ENABLED | SER_RS485_RTS_ON_SEND | SER_RS485_RTS_AFTER_SEND);
    if (wanted) {
        rs485.flags |= SER_RS485_ENABLED |
                       (mode == kModeRs485P ? SER_RS485_RTS_AFTER_SEND : SER_RS485_RTS_ON_SEND);
    }
    if (ioctl(fd, TIOCSRS485, &rs485) != 0 && wanted) {
        return systemError("the driver refused RS-485 mode");
    }
    return "";
}

void restoreTerminal(int fd, const termios& settings) {
    termios now;
    if (tcgetattr(fd, &now) == 0 && sameSettings(now, settings)) {
        return;
    }
    sigset_t ttou;
    sigset_t previous;
    sigemptyset(&ttou);
    sigaddset(&ttou, SIGTTOU);
    pthread_sigmask(SIG_BLOCK, &ttou, &previous);
    tcsetattr(fd, TCSANOW, &settings);
    pthread_sigmask(SIG_SETMASK, &previous, nullptr);
}

}  // namespace xtok::host

// Line settings of a serial port: checking them and applying them to a device,
// through libserialport where it knows the device and termios where it does not.
#pragma once

#include <termios.h>

#include <cstdint>
#include <string>

struct sp_port;

namespace xtok::host {

/// The runtime's codes, as ISerialPort::Configure takes them.
struct LineSettings {
    int32_t baud;
    int32_t parity;  // 0 none, 1 even, 2 odd, 3 mark, 4 space
    int32_t bits;    // 5 to 8
    int32_t stop;    // 1 or 2
    int32_t mode;    // 0 RS-232, 1 RS-485, 2 RS-422, 3 RS-485P
};

/// Each of these answers "" on success, else why not.
std::string checkSettings(const LineSettings& settings);
std::string applyWithLibserialport(sp_port* port, const LineSettings& settings);
std::string applyWithTermios(int fd, const LineSettings& settings);

/// The part of applyWithTermios that decides: speed, character size, parity
/// and stop bits of checked `settings` into `t`. False when the baud rate has
/// no termios code.
bool setLineBits(termios& t, const LineSettings& settings);

/// RS-485 and RS-485P switch the kernel's RS-485 mode on (RTS high while
/// sending, or low while sending for RS-485P); RS-232 and RS-422 switch it
/// off where the driver has it. "" when done, or why the device cannot.
std::string applyLineMode(int fd, int32_t mode);

/// Raw 8-bit transfer with no flow control: what a token line needs whatever
/// the device was set to before.
std::string makeRaw(int fd);

}  // namespace xtok::host

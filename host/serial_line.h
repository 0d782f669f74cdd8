// Line settings of a serial port: checking them and applying them to a device,
// through libserialport where it knows the device and termios where it does not.
#pragma once

#include <termios.h>

#include <cstdint>
#include <string>
#include "xtokline/constants.h"

struct sp_port;

namespace xtok::host {

using xtok::LineSettings;

/// "9600,none,8,1,RS-232": codes by their names, numbers where a code has none.
std::string describeLine(const LineSettings& settings);

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

/// Puts `settings` back on a terminal, at once, unless it has them already.
/// Safe inside a signal handler; from a background process group too, where
/// a change would otherwise stop the program with SIGTTOU.
void restoreTerminal(int fd, const termios& settings);

}  // namespace xtok::host

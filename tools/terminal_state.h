// The settings of the terminal xtok-host was started on: kept at start and
// put back on every way out, so that neither readline nor a port mapped to
// the terminal itself leaves the shell without echo or line editing.
#pragma once

namespace xtok::tools {

/// When standard input is a terminal, keeps its settings and arranges that
/// they are put back at exit and on an uncaught exception.
void keepTerminalSettings();
/// Puts the kept settings back; safe inside a signal handler.
void restoreTerminalSettings();

}  // namespace xtok::tools

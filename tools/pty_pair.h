// A pseudo-terminal pair standing in for a serial cable: the plug-in opens the
// slave side by its path, a simulated device talks on the master side.
#pragma once

#include <memory>
#include <string>

namespace xtok::tools {

class PtyPair {
public:
    /// Null with `error` set when the system has no pseudo-terminal to give.
    static std::unique_ptr<PtyPair> open(std::string& error);
    ~PtyPair();
    PtyPair(const PtyPair&) = delete;
    PtyPair& operator=(const PtyPair&) = delete;

    /// The device end; non-blocking. -1 once closed.
    int master() const { return master_; }
    /// What the plug-in opens, e.g. /dev/pts/3.
    const std::string& slavePath() const { return slavePath_; }
    /// Pulls the cable: the plug-in's end sees a hang-up from now on.
    void closeMaster();

private:
    PtyPair(int master, int slave, std::string slavePath);

    int master_;
    // Held so that the device end never sees a hang-up merely because the
    // plug-in has its port closed for a while.
    int slave_;
    std::string slavePath_;
};

}  // namespace xtok::tools

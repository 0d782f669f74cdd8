// Collects the host's notices for a test to look at.
#pragma once

#include <mutex>
#include <string>
#include <vector>

#include "host/notice.h"

namespace xtok::host::test {

class NoticeLog {
public:
    /// A sink for HostOptions and the services; this log must outlive them.
    Notice sink() {
        return [this](const std::string& text) {
            std::lock_guard<std::mutex> lock(mutex_);
            lines_.push_back(text);
        };
    }
    std::vector<std::string> lines() const {
        std::lock_guard<std::mutex> lock(mutex_);
        return lines_;
    }
    /// How many lines contain `part`.
    int count(const std::string& part) const {
        int found = 0;
        for (const std::string& line : lines()) {
            found += line.find(part) != std::string::npos ? 1 : 0;
        }
        return found;
    }

private:
    mutable std::mutex mutex_;
    std::vector<std::string> lines_;
};

}  // namespace xtok::host::test

// Collects log records while it lives (for tests that check what was logged).
#pragma once

#include <mutex>
#include <string>
#include <string_view>
#include <vector>

#include "lib/debug/Log.h"

namespace vek::debug {

class LogCapture {
public:
    struct Entry {
        Level level;
        std::string file;
        int line;
        std::string message;
        bool assertion;
        std::string stackTrace;
    };

    LogCapture()
        : sink_([this](const Record& r) {
              std::lock_guard lock(mutex_);
              entries_.push_back({r.level, std::string(r.file), r.line, std::string(r.message), r.assertion,
                                  std::string(r.stackTrace)});
          }) {}

    std::vector<Entry> entries() const {
        std::lock_guard lock(mutex_);
        return entries_;
    }
    // Messages of the records at `level` (assertions: their expressions), in order.
    std::vector<std::string> messages(Level level, bool assertions = false) const {
        std::vector<std::string> out;
        for (const Entry& e : entries())
            if (e.level == level && e.assertion == assertions) out.push_back(e.message);
        return out;
    }
    std::vector<std::string> warnings() const { return messages(Level::Warning); }
    std::vector<std::string> assertions() const { return messages(Level::Error, true); }
    void clear() {
        std::lock_guard lock(mutex_);
        entries_.clear();
    }

private:
    mutable std::mutex mutex_;
    std::vector<Entry> entries_;
    ScopedSink sink_;  // last: removed before the entries go
};

}  // namespace vek::debug

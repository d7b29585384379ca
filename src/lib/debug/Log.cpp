#include "lib/debug/Log.h"

#include <atomic>
#include <cstdio>
#include <cstdlib>
#include <mutex>
#include <string>
#include <utility>
#include <vector>

#include "lib/debug/StackTrace.h"

namespace vek::debug {
namespace {

Level levelFromEnvironment() {
    const char* value = std::getenv("NOCTIVA_LOG");
    if (!value) return Level::Off;
    const std::string_view v(value);
    for (Level l : {Level::Debug, Level::Info, Level::Warning, Level::Error, Level::Off})
        if (v == levelName(l)) return l;
    return Level::Off;
}

struct State {
    std::mutex mutex;
    std::vector<std::pair<uint64_t, Sink>> sinks;
    uint64_t nextId = 1;
    std::atomic<Level> console{levelFromEnvironment()};
};

State& state() {
    static State s;
    return s;
}

void dispatch(const Record& record) {
    State& s = state();
    std::vector<Sink> sinks;
    {
        std::lock_guard lock(s.mutex);
        sinks.reserve(s.sinks.size());
        for (const auto& entry : s.sinks) sinks.push_back(entry.second);
    }
    for (const Sink& sink : sinks) {
        try {
            sink(record);
        } catch (...) {
            // A faulty sink must not turn logging into a failure of the caller.
        }
    }
    if (record.level < s.console.load(std::memory_order_relaxed)) return;
    std::string line;
    line.reserve(record.message.size() + record.stackTrace.size() + 64);
    line += '[';
    line += levelName(record.level);
    line += "] ";
    line += record.file;
    line += ':';
    line += std::to_string(record.line);
    line += record.assertion ? ": assertion failed: " : ": ";
    line += record.message;
    line += '\n';
    line += record.stackTrace;
    std::lock_guard lock(s.mutex);
    std::fwrite(line.data(), 1, line.size(), stderr);
}

bool anyoneListens(Level level) {
    State& s = state();
    if (level >= s.console.load(std::memory_order_relaxed)) return true;
    std::lock_guard lock(s.mutex);
    return !s.sinks.empty();
}

}  // namespace

std::string_view levelName(Level level) noexcept {
    switch (level) {
        case Level::Debug: return "debug";
        case Level::Info: return "info";
        case Level::Warning: return "warning";
        case Level::Error: return "error";
        case Level::Off: return "off";
    }
    return "off";
}

Level consoleLevel() noexcept { return state().console.load(); }
void setConsoleLevel(Level level) noexcept { state().console.store(level); }

void log(Level level, std::string_view file, int line, std::string_view message) {
    if (level == Level::Off || !anyoneListens(level)) return;
    try {
        dispatch(Record{level, file, line, message, false, {}});
    } catch (...) {
        // Logging never throws (out of memory while formatting is dropped).
    }
}

void logAssertion(std::string_view file, int line, std::string_view expression) {
    if (!anyoneListens(Level::Error)) return;
    try {
        const std::string trace = currentStackTrace(1);
        dispatch(Record{Level::Error, file, line, expression, true, trace});
    } catch (...) {
    }
}

ScopedSink::ScopedSink(Sink sink) {
    State& s = state();
    std::lock_guard lock(s.mutex);
    id_ = s.nextId++;
    s.sinks.emplace_back(id_, std::move(sink));
}

ScopedSink::~ScopedSink() {
    State& s = state();
    std::lock_guard lock(s.mutex);
    std::erase_if(s.sinks, [this](const auto& entry) { return entry.first == id_; });
}

}  // namespace vek::debug

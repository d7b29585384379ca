// The log: records with a level, a source file and line, and a message. Records go to
// standard error from the console level on (off unless NOCTIVA_LOG=debug|info|warning|error
// asks for them) and to every installed sink whatever the level, so tests can capture them.
// A failed assertion is logged with a stack trace and the program carries on.
#pragma once

#include <cstdint>
#include <functional>
#include <string_view>

namespace vek::debug {

enum class Level : uint8_t { Debug, Info, Warning, Error, Off };

struct Record {
    Level level;
    std::string_view file;
    int line;
    std::string_view message;     // for an assertion: the expression that was false
    bool assertion = false;
    std::string_view stackTrace;  // assertions only
};

using Sink = std::function<void(const Record&)>;

void log(Level level, std::string_view file, int line, std::string_view message);

// Logs at Level::Error with a stack trace of the caller.
void logAssertion(std::string_view file, int line, std::string_view expression);

std::string_view levelName(Level level) noexcept;

Level consoleLevel() noexcept;
void setConsoleLevel(Level level) noexcept;

// Installs a sink for its lifetime. Sinks are called on the logging thread, outside the
// log's lock, so a sink may log itself.
class ScopedSink {
public:
    explicit ScopedSink(Sink sink);
    ~ScopedSink();
    ScopedSink(const ScopedSink&) = delete;
    ScopedSink& operator=(const ScopedSink&) = delete;

private:
    uint64_t id_;
};

}  // namespace vek::debug

#define VEK_LOG(level, file, message) ::vek::debug::log((level), (file), __LINE__, (message))
// Evaluates to the condition; logs it as a failed assertion when false.
#define VEK_CHECK(file, condition) \
    (static_cast<bool>(condition) ? true : (::vek::debug::logAssertion((file), __LINE__, #condition), false))

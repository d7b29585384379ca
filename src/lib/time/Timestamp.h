// A point in time in whole seconds since the Unix epoch, 64-bit so it does not end in 2038.
#pragma once

#include <chrono>
#include <compare>
#include <cstdint>

namespace vek::time {

class Timestamp {
public:
    constexpr Timestamp() noexcept = default;  // the epoch
    static constexpr Timestamp fromSecondsSinceEpoch(int64_t seconds) noexcept { return Timestamp(seconds); }
    static Timestamp now() noexcept;
    static Timestamp fromTimePoint(std::chrono::system_clock::time_point point) noexcept;

    constexpr int64_t secondsSinceEpoch() const noexcept { return seconds_; }
    std::chrono::system_clock::time_point toTimePoint() const noexcept;

    friend constexpr auto operator<=>(const Timestamp&, const Timestamp&) noexcept = default;

private:
    constexpr explicit Timestamp(int64_t seconds) noexcept : seconds_(seconds) {}
    int64_t seconds_ = 0;
};

}  // namespace vek::time

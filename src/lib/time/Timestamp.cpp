#include "lib/time/Timestamp.h"

namespace vek::time {

Timestamp Timestamp::now() noexcept { return fromTimePoint(std::chrono::system_clock::now()); }

Timestamp Timestamp::fromTimePoint(std::chrono::system_clock::time_point point) noexcept {
    using namespace std::chrono;
    return Timestamp(floor<seconds>(point).time_since_epoch().count());
}

std::chrono::system_clock::time_point Timestamp::toTimePoint() const noexcept {
    using namespace std::chrono;
    // The clock's ticks are finer than seconds; clamp instead of overflowing far from now.
    constexpr auto hi = duration_cast<seconds>(system_clock::duration::max()).count();
    constexpr auto lo = duration_cast<seconds>(system_clock::duration::min()).count();
    const int64_t s = seconds_ > hi ? hi : (seconds_ < lo ? lo : seconds_);
    return system_clock::time_point(duration_cast<system_clock::duration>(seconds(s)));
}

}  // namespace vek::time

// The module's PIPL and AETE resources, generated at compile time from one description. The same
// bytes go into named ELF sections on Linux and into PE resources on Windows.
#pragma once

#include <array>
#include <cstddef>
#include <cstdint>
#include <string_view>

#include "hostapi/HostInterface.h"

namespace resources {

constexpr int16_t kPIPLResourceId = 16004;
constexpr int16_t kAETEResourceId = 16013;
constexpr uint16_t kResourceLanguage = 1033;

struct FilterCase {
    uint8_t inputHandling;
    uint8_t outputHandling;
    uint8_t flags1;
    uint8_t flags2;
};

struct Description {
    std::string_view name;
    std::string_view category;
    int16_t versionMajor;
    int16_t versionMinor;
    std::string_view entryPoint;
    uint32_t terminologyClass;
    uint32_t terminologyEvent;
    int16_t terminologyId;
    std::string_view terminologyScope;
    uint8_t modeFlags[2];
    std::string_view enableExpression;
    uint8_t filterLayerSupport;
    FilterCase cases[7];
    // Scripting terminology.
    std::string_view suiteName;
    std::string_view suiteDescription;
    uint32_t suiteId;
    std::string_view eventName;
    std::string_view eventDescription;
    std::string_view parameterName;
    uint32_t parameterKey;
    uint32_t parameterType;
};

// Straight data in and out; works with blank data (bit 1) and filters layer masks (bit 2).
constexpr FilterCase kStraightCase{1, 1, 0x06, 0};

constexpr Description kNoctiva{
    .name = "Noctiva...",
    .category = "**Hidden**",
    .versionMajor = 4,
    .versionMinor = 0,
    .entryPoint = "ENTRYPOINT",
    .terminologyClass = pi::fourCC("qv06"),
    .terminologyEvent = pi::fourCC("qv06"),
    .terminologyId = kAETEResourceId,
    .terminologyScope = "",
    .modeFlags = {0x10, 0x00},  // RGB; 16-bit RGB is enabled by the expression
    .enableExpression = "in (PSHOP_ImageMode, RGBMode, RGB48Mode)",
    .filterLayerSupport = 0x80,
    .cases = {kStraightCase, kStraightCase, kStraightCase, kStraightCase, kStraightCase, kStraightCase,
              kStraightCase},
    .suiteName = "Vek Software",
    .suiteDescription = "Noctiva scripting suite",
    .suiteId = pi::fourCC("qv06"),
    .eventName = "Noctiva",
    .eventDescription = "Shadow noise reduction driven by a settings text",
    .parameterName = "Parameter 1",
    .parameterKey = pi::keyPar1,
    .parameterType = pi::typeText,
};

// Little-endian byte writer; with a null buffer it only counts.
class Writer {
public:
    constexpr explicit Writer(uint8_t* out = nullptr) : out_(out) {}
    constexpr void u8(uint8_t v) {
        if (out_) out_[pos_] = v;
        ++pos_;
    }
    constexpr void u16(uint16_t v) {
        u8(uint8_t(v));
        u8(uint8_t(v >> 8));
    }
    constexpr void u32(uint32_t v) {
        u16(uint16_t(v));
        u16(uint16_t(v >> 16));
    }
    constexpr void bytes(std::string_view s) {
        for (char c : s) u8(uint8_t(c));
    }
    constexpr void cstring(std::string_view s) {
        bytes(s);
        u8(0);
    }
    constexpr void pstring(std::string_view s) {
        u8(uint8_t(s.size()));
        bytes(s);
    }
    constexpr void zeros(std::size_t n) {
        for (std::size_t i = 0; i < n; ++i) u8(0);
    }
    constexpr std::size_t size() const { return pos_; }

private:
    uint8_t* out_;
    std::size_t pos_ = 0;
};

namespace detail {

constexpr uint32_t kVendor = pi::fourCC("8BIM");

// One property: header, then its data padded to a multiple of four bytes (the padding counts from the
// data's start: the header leaves properties at 2 mod 4); the stored length is the padded one.
template <typename Fill>
constexpr void property(Writer& w, uint32_t key, Fill&& fill) {
    Writer measure;
    fill(measure);
    const std::size_t padded = (measure.size() + 3) & ~std::size_t(3);
    w.u32(kVendor);
    w.u32(key);
    w.u32(0);
    w.u32(uint32_t(padded));
    fill(w);
    w.zeros(padded - measure.size());
}

constexpr void writePIPL(Writer& w, const Description& d) {
    w.u16(1);
    w.u32(0);
    w.u32(10);
    property(w, pi::fourCC("kind"), [](Writer& x) { x.u32(pi::fourCC("8BFM")); });
    property(w, pi::fourCC("name"), [&](Writer& x) { x.pstring(d.name); });
    property(w, pi::fourCC("catg"), [&](Writer& x) { x.pstring(d.category); });
    property(w, pi::fourCC("vers"), [&](Writer& x) { x.u32((uint32_t(d.versionMajor) << 16) | uint16_t(d.versionMinor)); });
    property(w, pi::fourCC("8664"), [&](Writer& x) { x.cstring(d.entryPoint); });
    property(w, pi::fourCC("hstm"), [&](Writer& x) {
        x.u32(0);
        x.u32(d.terminologyClass);
        x.u32(d.terminologyEvent);
        x.u16(uint16_t(d.terminologyId));
        x.cstring(d.terminologyScope);
    });
    property(w, pi::fourCC("mode"), [&](Writer& x) {
        x.u8(d.modeFlags[0]);
        x.u8(d.modeFlags[1]);
    });
    property(w, pi::fourCC("enbl"), [&](Writer& x) { x.cstring(d.enableExpression); });
    property(w, pi::fourCC("flly"), [&](Writer& x) { x.u8(d.filterLayerSupport); });
    property(w, pi::fourCC("fici"), [&](Writer& x) {
        for (const FilterCase& c : d.cases) {
            x.u8(c.inputHandling);
            x.u8(c.outputHandling);
            x.u8(c.flags1);
            x.u8(c.flags2);
        }
    });
}

constexpr void writeAETE(Writer& w, const Description& d) {
    w.u16(1);      // leading word of the Windows form
    w.u8(1);       // major version
    w.u8(0);       // minor version
    w.u16(0);      // language
    w.u16(0);      // script
    w.u16(1);      // suites
    w.pstring(d.suiteName);
    w.pstring(d.suiteDescription);
    w.u32(d.suiteId);
    w.u16(1);      // level
    w.u16(1);      // version
    w.u16(1);      // events
    w.pstring(d.eventName);
    w.pstring(d.eventDescription);
    w.u32(d.terminologyClass);
    w.u32(d.terminologyEvent);
    w.u32(pi::typeNull);  // no reply
    w.pstring("");
    w.u16(0);
    w.u32(pi::typeImageReference);  // direct parameter
    w.pstring("");
    w.u16(0xB000);
    w.u16(1);      // further parameters
    w.pstring(d.parameterName);
    w.u32(d.parameterKey);
    w.u32(d.parameterType);
    w.pstring("");
    w.u16(0);
    w.u16(0);      // classes
    w.u16(0);      // comparison operators
    w.u16(0);      // enumerations
}

template <auto Write>
constexpr std::size_t measure(const Description& d) {
    Writer w;
    Write(w, d);
    return w.size();
}

}  // namespace detail

constexpr std::size_t kPIPLSize = detail::measure<detail::writePIPL>(kNoctiva);
constexpr std::size_t kAETESize = detail::measure<detail::writeAETE>(kNoctiva);

constexpr std::array<uint8_t, kPIPLSize> buildPIPL(const Description& d = kNoctiva) {
    std::array<uint8_t, kPIPLSize> out{};
    Writer w(out.data());
    detail::writePIPL(w, d);
    return out;
}

constexpr std::array<uint8_t, kAETESize> buildAETE(const Description& d = kNoctiva) {
    std::array<uint8_t, kAETESize> out{};
    Writer w(out.data());
    detail::writeAETE(w, d);
    return out;
}

}  // namespace resources

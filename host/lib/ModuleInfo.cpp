// The PIPL and AETE resources: little-endian, four-character codes as 32-bit values, every read
// checked against the resource's end.
#include "noctiva/host/ModuleInfo.h"

#include <algorithm>
#include <cstring>
#include <stdexcept>

#ifndef _WIN32
#include "ElfSections.h"
#endif

#ifdef _WIN32
#include <windows.h>
#endif

namespace noctiva::host {

namespace {

constexpr int kLatestVersionMajor = 4, kLatestVersionMinor = 0;
constexpr int kModeCount = 18;

std::string codeText(std::uint32_t code) {
    std::string s = "'";
    for (int shift = 24; shift >= 0; shift -= 8) {
        const char c = char((code >> shift) & 0xFF);
        s += (c >= 0x20 && c < 0x7F) ? c : '?';
    }
    return s + "'";
}

// A malformed resource: the reason, without the file (added by the caller).
struct Malformed : std::runtime_error {
    using std::runtime_error::runtime_error;
};

class Reader {
public:
    Reader(std::span<const std::uint8_t> bytes, std::string what) : bytes_(bytes), what_(std::move(what)) {}

    std::size_t remaining() const { return bytes_.size() - pos_; }
    std::size_t position() const { return pos_; }
    void need(std::size_t n, const char* item) const {
        if (n > remaining())
            throw Malformed(what_ + " ends inside " + item + " (offset " + std::to_string(pos_) + ")");
    }
    std::uint8_t u8(const char* item) {
        need(1, item);
        return bytes_[pos_++];
    }
    std::uint16_t u16(const char* item) {
        need(2, item);
        const std::uint16_t v = std::uint16_t(bytes_[pos_] | (bytes_[pos_ + 1] << 8));
        pos_ += 2;
        return v;
    }
    std::uint32_t u32(const char* item) {
        need(4, item);
        const std::uint32_t v = std::uint32_t(bytes_[pos_]) | (std::uint32_t(bytes_[pos_ + 1]) << 8) |
                                (std::uint32_t(bytes_[pos_ + 2]) << 16) | (std::uint32_t(bytes_[pos_ + 3]) << 24);
        pos_ += 4;
        return v;
    }
    std::int16_t i16(const char* item) { return std::int16_t(u16(item)); }
    std::int32_t i32(const char* item) { return std::int32_t(u32(item)); }
    std::string pstring(const char* item) {
        const std::size_t length = u8(item);
        need(length, item);
        std::string s(reinterpret_cast<const char*>(bytes_.data() + pos_), length);
        pos_ += length;
        return s;
    }
    // A zero-terminated string that must end inside the remaining bytes.
    std::string cstring(const char* item) {
        const auto* start = reinterpret_cast<const char*>(bytes_.data() + pos_);
        const std::size_t length = strnlen(start, remaining());
        if (length == remaining()) throw Malformed(what_ + ": unterminated " + item);
        pos_ += length + 1;
        return std::string(start, length);
    }
    std::span<const std::uint8_t> take(std::size_t n, const char* item) {
        need(n, item);
        const auto s = bytes_.subspan(pos_, n);
        pos_ += n;
        return s;
    }

private:
    std::span<const std::uint8_t> bytes_;
    std::string what_;
    std::size_t pos_ = 0;
};

struct Pipl {
    ModuleInfo info;
    bool haveKind = false, haveVersion = false, haveEntry = false;
};

void readProperty(Pipl& p, std::uint32_t key, std::span<const std::uint8_t> data) {
    ModuleInfo& info = p.info;
    const std::string what = "PIPL property " + codeText(key);
    Reader r(data, what);
    if (key == pi::fourCC("kind")) {
        info.kind = r.u32("the kind");
        p.haveKind = true;
    } else if (key == pi::fourCC("name")) {
        info.name = r.pstring("the name");
    } else if (key == pi::fourCC("catg")) {
        info.category = r.pstring("the category");
    } else if (key == pi::fourCC("vers")) {
        const std::uint32_t v = r.u32("the version");
        info.versionMajor = int(v >> 16);
        info.versionMinor = int(v & 0xFFFF);
        p.haveVersion = true;
    } else if (key == pi::fourCC("8664")) {
        info.entryPoint = r.cstring("entry point name");
        p.haveEntry = true;
    } else if (key == pi::fourCC("hstm")) {
        Terminology t;
        t.version = r.i32("the terminology version");
        t.classId = r.u32("the terminology class");
        t.eventId = r.u32("the terminology event");
        t.terminologyId = r.i16("the terminology id");
        t.scope = r.cstring("terminology scope");
        info.terminology = std::move(t);
    } else if (key == pi::fourCC("mode")) {
        info.modeFlags.assign(data.begin(), data.end());
    } else if (key == pi::fourCC("enbl")) {
        const std::string text = r.cstring("enable expression");
        try {
            info.enable = EnableExpression::parse(text);
        } catch (const std::invalid_argument& e) {
            throw Malformed("enable expression \"" + text + "\": " + e.what());
        }
    } else if (key == pi::fourCC("flly")) {
        info.filterLayer = r.u8("the filter-layer flags");
    } else if (key == pi::fourCC("fici")) {
        std::array<FilterCaseInfo, 7> cases;
        for (FilterCaseInfo& c : cases) {
            c.inputHandling = r.u8("the filter cases");
            c.outputHandling = r.u8("the filter cases");
            c.flags1 = r.u8("the filter cases");
            c.flags2 = r.u8("the filter cases");
        }
        info.filterCases = cases;
    }
}

ModuleInfo parsePipl(std::span<const std::uint8_t> bytes) {
    Reader r(bytes, "PIPL");
    const std::uint16_t word = r.u16("the header");
    if (word != 1) throw Malformed("PIPL starts with " + std::to_string(word) + ", not 1");
    const std::int32_t version = r.i32("the header");
    if (version != 0) throw Malformed("PIPL version " + std::to_string(version) + " is not supported (only 0)");
    const std::int32_t count = r.i32("the header");
    // Each property takes at least its 16-byte header: a larger count cannot be true.
    if (count < 0 || std::size_t(count) > r.remaining() / 16)
        throw Malformed("PIPL claims " + std::to_string(count) + " properties in " +
                        std::to_string(r.remaining()) + " bytes");

    Pipl p;
    std::vector<std::uint32_t> seen;
    for (std::int32_t i = 0; i < count; ++i) {
        const std::uint32_t vendor = r.u32("a property header");
        const std::uint32_t key = r.u32("a property header");
        r.i32("a property header");  // id
        const std::int32_t length = r.i32("a property header");
        if (length < 0 || std::size_t(length) > r.remaining())
            throw Malformed("PIPL property " + codeText(key) + " claims " + std::to_string(length) + " bytes, " +
                            std::to_string(r.remaining()) + " remain");
        const auto data = r.take(std::size_t(length), "a property");
        // The stored length is normally padded already; a writer that stored the bare length still
        // padded the data to four bytes, counted from the data's start.
        const std::size_t padding = (4 - std::size_t(length) % 4) % 4;
        r.take(std::min(padding, r.remaining()), "a property");
        // Other vendors' properties mean nothing to us; of a repeated key the first counts.
        if (vendor != pi::fourCC("8BIM")) continue;
        if (std::find(seen.begin(), seen.end(), key) != seen.end()) continue;
        seen.push_back(key);
        readProperty(p, key, data);
    }

    ModuleInfo& info = p.info;
    if (!p.haveKind) throw Malformed("PIPL does not say what kind of module this is (no 'kind')");
    if (info.kind != pi::fourCC("8BFM"))
        throw Malformed("not a filter module (kind " + codeText(info.kind) + ", a filter is '8BFM')");
    if (!p.haveVersion) throw Malformed("PIPL has no interface version ('vers')");
    if (info.versionMajor > kLatestVersionMajor ||
        (info.versionMajor == kLatestVersionMajor && info.versionMinor > kLatestVersionMinor))
        throw Malformed("module needs filter interface " + std::to_string(info.versionMajor) + "." +
                        std::to_string(info.versionMinor) + "; this host provides " +
                        std::to_string(kLatestVersionMajor) + "." + std::to_string(kLatestVersionMinor));
    if (!p.haveEntry || info.entryPoint.empty())
        throw Malformed("PIPL names no x86-64 entry point ('8664')");
    return std::move(info);
}

AeteParameter readParameter(Reader& r) {
    AeteParameter p;
    p.name = r.pstring("a parameter name");
    p.key = r.u32("a parameter key");
    p.type = r.u32("a parameter type");
    p.description = r.pstring("a parameter description");
    p.flags = r.u16("parameter flags");
    return p;
}

// All events of all suites, as far as the layout this host knows reaches.
std::vector<AeteEvent> parseAete(std::span<const std::uint8_t> bytes) {
    Reader r(bytes, "AETE");
    const std::uint16_t word = r.u16("the header");
    if (word != 1) throw Malformed("AETE starts with " + std::to_string(word) + ", not 1");
    const std::uint8_t major = r.u8("the header");
    r.u8("the header");  // minor version
    if (major != 1) throw Malformed("AETE version " + std::to_string(major) + " is not supported (only 1)");
    r.i16("the header");  // language
    r.i16("the header");  // script
    const std::int16_t suites = r.i16("the suite count");
    if (suites < 0) throw Malformed("AETE has a negative suite count");

    std::vector<AeteEvent> events;
    for (int s = 0; s < suites; ++s) {
        AeteEvent suite;
        suite.suiteName = r.pstring("a suite name");
        r.pstring("a suite description");
        suite.suiteId = r.u32("a suite id");
        r.i16("a suite level");
        r.i16("a suite version");
        const std::int16_t eventCount = r.i16("an event count");
        if (eventCount < 0) throw Malformed("AETE has a negative event count");
        for (int e = 0; e < eventCount; ++e) {
            AeteEvent event = suite;
            event.name = r.pstring("an event name");
            event.description = r.pstring("an event description");
            event.eventClass = r.u32("an event class");
            event.eventId = r.u32("an event id");
            event.replyType = r.u32("a reply type");
            r.pstring("a reply description");
            r.u16("reply flags");
            event.directParameterType = r.u32("a direct parameter type");
            r.pstring("a direct parameter description");
            event.directParameterFlags = r.u16("direct parameter flags");
            const std::int16_t parameters = r.i16("a parameter count");
            if (parameters < 0) throw Malformed("AETE has a negative parameter count");
            for (int p = 0; p < parameters; ++p) event.parameters.push_back(readParameter(r));
            events.push_back(std::move(event));
        }
        // Classes have a layout of their own; a suite that declares any ends what we read.
        if (r.i16("a class count") != 0) break;
        const std::int16_t operators = r.i16("an operator count");
        if (operators < 0) throw Malformed("AETE has a negative operator count");
        for (int o = 0; o < operators; ++o) {
            r.pstring("an operator name");
            r.u32("an operator id");
            r.pstring("an operator description");
        }
        const std::int16_t enumerations = r.i16("an enumeration count");
        if (enumerations < 0) throw Malformed("AETE has a negative enumeration count");
        for (int n = 0; n < enumerations; ++n) {
            r.u32("an enumeration type");
            const std::int16_t values = r.i16("an enumeration size");
            if (values < 0) throw Malformed("AETE has a negative enumeration size");
            for (int v = 0; v < values; ++v) {
                r.pstring("an enumerator name");
                r.u32("an enumerator key");
                r.pstring("an enumerator description");
            }
        }
    }
    return events;
}

}  // namespace

bool ModuleInfo::modeFlagged(pi::int16 imageMode) const {
    if (imageMode < 0) return false;
    const std::size_t byte = std::size_t(imageMode) / 8;
    return byte < modeFlags.size() && (modeFlags[byte] & (0x80 >> (imageMode % 8))) != 0;
}

bool ModuleInfo::supportsMode(pi::int16 imageMode, int depth) const {
    return enable ? enable->evaluate(imageMode, depth) : modeFlagged(imageMode);
}

std::vector<std::string> ModuleInfo::supportedModes() const {
    std::vector<std::string> modes;
    for (pi::int16 m = 0; m < kModeCount; ++m)
        if (supportsMode(m, naturalDepth(m))) modes.push_back(modeDescription(m, naturalDepth(m)));
    return modes;
}

std::string ModuleInfo::supportedModesText() const {
    std::string text;
    for (const std::string& m : supportedModes()) text += (text.empty() ? "" : ", ") + m;
    return text.empty() ? "no image mode" : text;
}

ModuleInfo parseModuleResources(const std::string& subject, std::span<const std::uint8_t> pipl,
                                std::optional<std::span<const std::uint8_t>> aete) {
    try {
        ModuleInfo info = parsePipl(pipl);
        if (!aete) return info;
        std::vector<AeteEvent> events = parseAete(*aete);
        if (!info.terminology) {
            if (!events.empty()) info.event = std::move(events.front());
            return info;
        }
        const Terminology& t = *info.terminology;
        for (AeteEvent& e : events)
            if (e.eventClass == t.classId && e.eventId == t.eventId) {
                info.event = std::move(e);
                return info;
            }
        throw Malformed("AETE describes no event " + codeText(t.classId) + "/" + codeText(t.eventId) +
                        ", which the PIPL terminology names");
    } catch (const Malformed& e) {
        throw HostError(subject, e.what());
    }
}

#ifdef _WIN32
namespace {

// The module mapped as data only: nothing of it runs.
struct ResourceImage {
    HMODULE module;
    explicit ResourceImage(const std::filesystem::path& path)
        : module(LoadLibraryExW(path.c_str(), nullptr, LOAD_LIBRARY_AS_DATAFILE | LOAD_LIBRARY_AS_IMAGE_RESOURCE)) {}
    ~ResourceImage() {
        if (module) FreeLibrary(module);
    }
    ResourceImage(const ResourceImage&) = delete;
    ResourceImage& operator=(const ResourceImage&) = delete;

    std::optional<std::span<const std::uint8_t>> find(const wchar_t* type, LPCWSTR id) const {
        HRSRC info = FindResourceW(module, id, type);
        if (!info) return std::nullopt;
        HGLOBAL loaded = LoadResource(module, info);
        const void* bytes = loaded ? LockResource(loaded) : nullptr;
        if (!bytes) return std::nullopt;
        return std::span<const std::uint8_t>(static_cast<const std::uint8_t*>(bytes), SizeofResource(module, info));
    }
};

BOOL CALLBACK firstName(HMODULE, LPCWSTR, LPWSTR name, LONG_PTR out) {
    // Only numeric IDs: a string name would need copying, and filters use numbers.
    if (!IS_INTRESOURCE(name)) return TRUE;
    *reinterpret_cast<std::optional<WORD>*>(out) = WORD(reinterpret_cast<ULONG_PTR>(name));
    return FALSE;
}

}  // namespace

ModuleInfo readModuleInfo(const std::filesystem::path& path) {
    const ResourceImage image(path);
    if (!image.module)
        throw HostError(path.string(), "cannot read module resources: error " + std::to_string(GetLastError()));
    // The first PIPL; a module with several menu entries has one per entry.
    std::optional<WORD> piplId;
    EnumResourceNamesW(image.module, L"PIPL", firstName, reinterpret_cast<LONG_PTR>(&piplId));
    const auto pipl = piplId ? image.find(L"PIPL", MAKEINTRESOURCEW(*piplId)) : std::nullopt;
    if (!pipl) throw HostError(path.string(), "no PIPL resource: not a filter module for this host");
    // The AETE is the one the PIPL's terminology names.
    const ModuleInfo bare = parseModuleResources(path.string(), *pipl, std::nullopt);
    std::optional<std::span<const std::uint8_t>> aete;
    if (bare.terminology) aete = image.find(L"AETE", MAKEINTRESOURCEW(WORD(bare.terminology->terminologyId)));
    return parseModuleResources(path.string(), *pipl, aete);
}
#else
ModuleInfo readModuleInfo(const std::filesystem::path& path) {
    auto sections = readElfSections(path, {"PIPL", "AETE"});
    if (!sections[0]) throw HostError(path.string(), "no PIPL resource: not a filter module for this host");
    std::optional<std::span<const std::uint8_t>> aete;
    if (sections[1]) aete = std::span<const std::uint8_t>(*sections[1]);
    return parseModuleResources(path.string(), *sections[0], aete);
}
#endif

std::optional<HostError> checkImageSupported(const ModuleInfo& info, pi::int16 imageMode, int depth) {
    if (info.supportsMode(imageMode, depth)) return std::nullopt;
    return HostError(info.name.empty() ? "filter module" : info.name,
                     "this filter does not support " + modeDescription(imageMode, depth) + " images (it supports " +
                         info.supportedModesText() + ")");
}

}  // namespace noctiva::host

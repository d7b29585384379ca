// The module's resources read from its file as an image editor reads them, the refusal of images
// the module does not accept, and the parent window handed to the module.
#include <elf.h>
#include <gtest/gtest.h>

#include <cstring>
#include <fstream>
#include <string>
#include <vector>

#include "noctiva/host/Error.h"
#include "noctiva/host/Module.h"
#include "noctiva/host/ModuleInfo.h"
#include "noctiva/host/ParentWindow.h"
#include "noctiva/host/Session.h"
#include "lib/TestFiles.h"
#include "ui/Processes.h"

namespace fs = std::filesystem;
using namespace noctiva::host;

namespace {

using Bytes = std::vector<std::uint8_t>;

// Little-endian assembly of resources.
struct Out {
    Bytes b;
    Out& u8(std::uint8_t v) { return b.push_back(v), *this; }
    Out& u16(std::uint16_t v) { return u8(std::uint8_t(v)).u8(std::uint8_t(v >> 8)); }
    Out& u32(std::uint32_t v) { return u16(std::uint16_t(v)).u16(std::uint16_t(v >> 16)); }
    Out& str(const std::string& s) { return b.insert(b.end(), s.begin(), s.end()), *this; }
    Out& pstr(const std::string& s) { return u8(std::uint8_t(s.size())).str(s); }
    Out& cstr(const std::string& s) { return str(s).u8(0); }
    Out& bytes(const Bytes& d) { return b.insert(b.end(), d.begin(), d.end()), *this; }
};

struct Prop {
    Prop(std::uint32_t k, Bytes d, std::uint32_t v = pi::fourCC("8BIM")) : key(k), data(std::move(d)), vendor(v) {}
    std::uint32_t key;
    Bytes data;
    std::uint32_t vendor;
    std::optional<std::int32_t> storedLength;  // default: padded length
};

Bytes pipl(const std::vector<Prop>& props, std::uint16_t word = 1, std::int32_t version = 0,
           std::optional<std::int32_t> count = {}) {
    Out o;
    o.u16(word).u32(std::uint32_t(version)).u32(std::uint32_t(count.value_or(std::int32_t(props.size()))));
    for (const Prop& p : props) {
        const std::size_t padded = (p.data.size() + 3) & ~std::size_t(3);
        o.u32(p.vendor).u32(p.key).u32(0).u32(std::uint32_t(p.storedLength.value_or(std::int32_t(padded))));
        o.bytes(p.data);
        o.b.resize(o.b.size() + padded - p.data.size());
    }
    return o.b;
}

Bytes u32le(std::uint32_t v) { return Out().u32(v).b; }
Bytes pstrData(const std::string& s) { return Out().pstr(s).b; }
Bytes cstrData(const std::string& s) { return Out().cstr(s).b; }

std::vector<Prop> filterProps(const std::string& entry = "ENTRYPOINT",
                              const std::optional<std::string>& enbl = "in (PSHOP_ImageMode, RGBMode, RGB48Mode)") {
    std::vector<Prop> p = {
        {pi::fourCC("kind"), u32le(pi::fourCC("8BFM"))},
        {pi::fourCC("name"), pstrData("Test...")},
        {pi::fourCC("catg"), pstrData("**Hidden**")},
        {pi::fourCC("vers"), u32le(0x00040000)},
        {pi::fourCC("8664"), cstrData(entry)},
        {pi::fourCC("hstm"), Out().u32(0).u32(pi::fourCC("tst1")).u32(pi::fourCC("tst1")).u16(16013).u8(0).b},
        {pi::fourCC("mode"), {0x10, 0x00}},
        {pi::fourCC("flly"), {0x80}},
        {pi::fourCC("fici"), Bytes(28, 1)},
    };
    if (enbl) p.push_back({pi::fourCC("enbl"), cstrData(*enbl)});
    return p;
}

Bytes aete() {
    Out o;
    o.u16(1).u8(1).u8(0).u16(0).u16(0).u16(1);
    o.pstr("Suite").pstr("about").u32(pi::fourCC("tst1")).u16(1).u16(1).u16(1);
    o.pstr("Test").pstr("an event").u32(pi::fourCC("tst1")).u32(pi::fourCC("tst1"));
    o.u32(pi::typeNull).pstr("").u16(0).u32(pi::typeImageReference).pstr("").u16(0xB000).u16(2);
    o.pstr("Parameter 1").u32(pi::keyPar1).u32(pi::typeText).pstr("").u16(0);
    o.pstr("Level").u32(pi::fourCC("levl")).u32(pi::typeInteger).pstr("how much").u16(0x8000);
    o.u16(0).u16(0).u16(1);  // classes, operators, one enumeration
    o.u32(pi::fourCC("Enmr")).u16(1).pstr("one").u32(pi::fourCC("one ")).pstr("");
    return o.b;
}

// A minimal ELF64 file: header, section contents, the name table, then the section table last, so
// that any truncation cuts into the table.
Bytes elf(const std::vector<std::pair<std::string, Bytes>>& sections) {
    Bytes file(sizeof(Elf64_Ehdr));
    std::vector<Elf64_Shdr> headers(1);
    Bytes names(1, 0);
    for (const auto& [name, data] : sections) {
        Elf64_Shdr h{};
        h.sh_name = std::uint32_t(names.size());
        names.insert(names.end(), name.begin(), name.end());
        names.push_back(0);
        h.sh_type = SHT_PROGBITS;
        h.sh_offset = file.size();
        h.sh_size = data.size();
        file.insert(file.end(), data.begin(), data.end());
        headers.push_back(h);
    }
    Elf64_Shdr strtab{};
    strtab.sh_name = std::uint32_t(names.size());
    const std::string strtabName = ".shstrtab";
    names.insert(names.end(), strtabName.begin(), strtabName.end());
    names.push_back(0);
    strtab.sh_type = SHT_STRTAB;
    strtab.sh_offset = file.size();
    strtab.sh_size = names.size();
    file.insert(file.end(), names.begin(), names.end());
    headers.push_back(strtab);
    while (file.size() % 8) file.push_back(0);

    Elf64_Ehdr e{};
    std::memcpy(e.e_ident, ELFMAG, SELFMAG);
    e.e_ident[EI_CLASS] = ELFCLASS64;
    e.e_ident[EI_DATA] = ELFDATA2LSB;
    e.e_ident[EI_VERSION] = EV_CURRENT;
    e.e_type = ET_DYN;
    e.e_machine = EM_X86_64;
    e.e_version = EV_CURRENT;
    e.e_ehsize = sizeof(Elf64_Ehdr);
    e.e_shentsize = sizeof(Elf64_Shdr);
    e.e_shnum = std::uint16_t(headers.size());
    e.e_shstrndx = std::uint16_t(headers.size() - 1);
    e.e_shoff = file.size();
    std::memcpy(file.data(), &e, sizeof e);
    const auto* raw = reinterpret_cast<const std::uint8_t*>(headers.data());
    file.insert(file.end(), raw, raw + headers.size() * sizeof(Elf64_Shdr));
    return file;
}

using vek::testing::TempDir;

fs::path writeBytes(const TempDir& dir, const std::string& name, const Bytes& data) {
    const fs::path p = dir / name;
    std::ofstream(p, std::ios::binary).write(reinterpret_cast<const char*>(data.data()), std::streamsize(data.size()));
    return p;
}

// The reason of the HostError `f` throws; fails the test if it throws nothing or something else.
template <typename F>
std::string errorOf(F&& f) {
    try {
        f();
    } catch (const HostError& e) {
        return e.reason();
    } catch (const std::exception& e) {
        ADD_FAILURE() << "not a HostError: " << e.what();
        return {};
    }
    ADD_FAILURE() << "no error";
    return {};
}

ModuleInfo parse(const Bytes& p, const std::optional<Bytes>& a = std::nullopt) {
    std::optional<std::span<const std::uint8_t>> aeteSpan;
    if (a) aeteSpan = std::span<const std::uint8_t>(*a);
    return parseModuleResources("test", p, aeteSpan);
}

}  // namespace

#ifdef NOCTIVA_MODULE_PATH
// The PIPL's bytes are pinned in tests/plugin and the parser's reading of every field is checked
// below on built resources; what only the real module shows is its AETE and its refusal message.
TEST(ModuleInfo, RealModuleDeclaresOneTextParameterAndRefusesGray) {
    const Module module = Module::load(NOCTIVA_MODULE_PATH);
    ASSERT_NE(module.info(), nullptr);
    EXPECT_NE(module.entry(), nullptr);
    const ModuleInfo& info = *module.info();
    ASSERT_TRUE(info.event);
    EXPECT_EQ(info.event->name, "Noctiva");
    EXPECT_EQ(info.event->eventClass, pi::fourCC("qv06"));
    EXPECT_EQ(info.event->eventId, pi::fourCC("qv06"));
    EXPECT_EQ(info.event->replyType, pi::typeNull);
    EXPECT_EQ(info.event->directParameterType, pi::typeImageReference);
    EXPECT_EQ(info.event->directParameterFlags, 0xB000);
    ASSERT_EQ(info.event->parameters.size(), 1u);
    EXPECT_EQ(info.event->parameters[0].name, "Parameter 1");
    EXPECT_EQ(info.event->parameters[0].key, pi::keyPar1);
    EXPECT_EQ(info.event->parameters[0].type, pi::typeText);
    EXPECT_EQ(info.event->parameters[0].flags, 0);

    const auto refusal = checkImageSupported(info, pi::plugInModeGrayScale, 8);
    ASSERT_TRUE(refusal);
    EXPECT_STREQ(refusal->what(),
                 "Noctiva...: this filter does not support Gray 8-bit images (it supports RGB 8-bit, RGB 16-bit)");
    EXPECT_FALSE(checkImageSupported(info, pi::plugInModeRGB48, 16));
}
#endif

TEST(ModuleInfo, ModuleWithoutPiplOpensOnlyByEntryName) {
    EXPECT_EQ(errorOf([] { Module::load(FAKE_MODULE_PATH); }), "no PIPL resource: not a filter module for this host");
    const Module module(FAKE_MODULE_PATH);
    EXPECT_EQ(module.info(), nullptr);
    EXPECT_NE(module.entry(), nullptr);
}

// The fake module given a PIPL of our own with objcopy: the entry point comes from the PIPL, and
// an image the expression refuses never reaches the module.
TEST(ModuleInfo, PiplAddedToFakeModuleDecidesEntryAndModes) {
    if (!runShell("objcopy --version > /dev/null 2>&1")) GTEST_SKIP() << "objcopy is missing";
    TempDir dir;
    auto withPipl = [&](const std::string& name, const Bytes& resource) {
        const fs::path section = writeBytes(dir, name + ".pipl", resource);
        const fs::path module = dir.path() / (name + ".so");
        const std::string cmd = "objcopy --add-section PIPL=" + section.string() +
                                " --set-section-flags PIPL=alloc " + std::string(FAKE_MODULE_PATH) + " " +
                                module.string() + " 2>/dev/null";
        EXPECT_TRUE(runShell(cmd)) << cmd;
        return module;
    };

    const fs::path grayOnly = withPipl("gray", pipl(filterProps("ENTRYPOINT", "PSHOP_ImageMode == GrayScaleMode")));
    const Module gray = Module::load(grayOnly);
    Image image(4, 3, 3, 8);
    const Image before = image;
    RunOptions options;
    options.parentWindow = false;
    try {
        runFilter(gray, image, options);
        ADD_FAILURE() << "an RGB image reached a gray-only module";
    } catch (const HostError& e) {
        EXPECT_STREQ(e.what(), "Test...: this filter does not support RGB 8-bit images (it supports Gray 8-bit)");
    }
    EXPECT_EQ(image, before);

    const Module rgb = Module::load(withPipl("rgb", pipl(filterProps())));
    const RunResult r = runFilter(rgb, image, options);
    EXPECT_TRUE(r.ok()) << r.message();
    EXPECT_EQ(image.at(0, 0, 0), 255);  // inverted

    const std::string missing = errorOf([&] { Module::load(withPipl("missing", pipl(filterProps("NoSuchEntry")))); });
    EXPECT_NE(missing.find("no entry point NoSuchEntry"), std::string::npos) << missing;
}

TEST(ModuleInfo, EnableExpressions) {
    struct Case {
        const char* text;
        pi::int16 mode;
        int depth;
        bool expected;
    };
    const Case cases[] = {
        {"in (PSHOP_ImageMode, RGBMode, RGB48Mode)", 3, 8, true},
        {"in (PSHOP_ImageMode, RGBMode, RGB48Mode)", 11, 16, true},
        {"in (PSHOP_ImageMode, RGBMode, RGB48Mode)", 1, 8, false},
        {"in(PSHOP_ImageMode,GrayScaleMode)", 1, 8, true},
        {"PSHOP_ImageMode == RGBMode", 3, 8, true},
        {"PSHOP_ImageMode == RGBMode", 4, 8, false},
        {"PSHOP_ImageMode != RGBMode", 4, 8, true},
        {"PSHOP_ImageDepth == 16", 11, 16, true},
        {"PSHOP_ImageDepth == 16", 3, 8, false},
        {"PSHOP_ImageDepth <= 8 && PSHOP_ImageDepth >= 8", 3, 8, true},
        {"PSHOP_ImageDepth < 16 || PSHOP_ImageDepth > 16", 11, 16, false},
        {"PSHOP_ImageMode == RGBMode || PSHOP_ImageMode == CMYKMode", 4, 8, true},
        {"PSHOP_ImageMode == RGBMode && PSHOP_ImageDepth == 16", 3, 8, false},
        {"!(PSHOP_ImageMode == GrayScaleMode)", 3, 8, true},
        {"! in (PSHOP_ImageMode, BitmapMode, IndexedColorMode)", 2, 8, false},
        // && binds tighter than ||.
        {"true || false && false", 3, 8, true},
        {"(true || false) && false", 3, 8, false},
        {"true", 1, 8, true},
        {"false", 3, 8, false},
        {"in (PSHOP_ImageMode, Gray32Mode, RGB96Mode)", 17, 32, true},
        {"in (PSHOP_ImageMode, DeepMultichannelMode, Duotone16Mode)", 14, 16, true},
        {"  PSHOP_ImageMode\t==\n3  ", 3, 8, true},
    };
    for (const Case& c : cases)
        EXPECT_EQ(EnableExpression::parse(c.text).evaluate(c.mode, c.depth), c.expected)
            << c.text << " mode " << c.mode << " depth " << c.depth;
}

TEST(ModuleInfo, MalformedEnableExpressionsAreRefused) {
    const std::string deep = std::string(200, '(') + "true" + std::string(200, ')');
    std::string chain = "true";
    for (int i = 0; i < 5000; ++i) chain += " && true";
    std::string nots(500, '!');
    nots += "true";
    for (const std::string text : {"", "in (PSHOP_ImageMode)", "in PSHOP_ImageMode, RGBMode", "PSHOP_ImageMode ==",
                                   "(RGBMode", "RGBMode)", "FooMode", "PSHOP_ImageWidth > 3", "99999999999",
                                   "PSHOP_ImageMode = RGBMode", "RGBMode & RGBMode", "in (1, 2,)", deep.c_str(),
                                   chain.c_str(), nots.c_str()})
        EXPECT_THROW(EnableExpression::parse(text), std::invalid_argument) << text.substr(0, 60);
}

TEST(ModuleInfo, ModeFlagsDecideWithoutExpression) {
    auto props = filterProps("ENTRYPOINT", std::nullopt);
    props[6].data = {0x50, 0x30};  // Gray and RGB; Gray16 and RGB48
    const ModuleInfo info = parse(pipl(props));
    EXPECT_FALSE(info.enable);
    EXPECT_EQ(info.supportedModesText(), "Gray 8-bit, RGB 8-bit, Gray 16-bit, RGB 16-bit");
    EXPECT_FALSE(info.supportsMode(pi::plugInModeCMYKColor, 8));
    EXPECT_FALSE(info.supportsMode(pi::plugInModeRGB96, 32));  // past the flag bytes
    EXPECT_FALSE(info.supportsMode(-1, 8));

    props.erase(props.begin() + 6);  // no 'mode' and no 'enbl': nothing is accepted
    const ModuleInfo none = parse(pipl(props));
    EXPECT_EQ(checkImageSupported(none, pi::plugInModeRGBColor, 8)->reason(),
              "this filter does not support RGB 8-bit images (it supports no image mode)");
}

TEST(ModuleInfo, OtherVendorsUnknownKeysAndUnpaddedLengthsAreSkipped) {
    auto props = filterProps();
    props.insert(props.begin(), Prop(pi::fourCC("kind"), u32le(pi::fourCC("8BPF")), pi::fourCC("ABCD")));
    props.push_back({pi::fourCC("prty"), u32le(0)});
    props.push_back({pi::fourCC("zzzz"), Bytes(13, 0xEE)});
    props[3].storedLength = 11;  // "**Hidden**": 11 bytes, padded to 12 in the file
    const ModuleInfo info = parse(pipl(props), aete());
    EXPECT_EQ(info.kind, pi::fourCC("8BFM"));
    EXPECT_EQ(info.name, "Test...");
    EXPECT_EQ(info.category, "**Hidden**");
    EXPECT_TRUE(info.hidden());
    EXPECT_EQ(info.entryPoint, "ENTRYPOINT");
    EXPECT_TRUE(info.supportsFilterLayers());
    ASSERT_TRUE(info.terminology);
    EXPECT_EQ(info.terminology->terminologyId, 16013);
    ASSERT_TRUE(info.event);
    EXPECT_EQ(info.event->suiteName, "Suite");
    ASSERT_EQ(info.event->parameters.size(), 2u);
    EXPECT_EQ(info.event->parameters[1].name, "Level");
    EXPECT_EQ(info.event->parameters[1].type, pi::typeInteger);
    EXPECT_EQ(info.event->parameters[1].flags, 0x8000);
}

TEST(ModuleInfo, MalformedPiplsGiveClearReasons) {
    auto with = [](auto change) {
        auto props = filterProps();
        change(props);
        return pipl(props);
    };
    auto find = [](std::vector<Prop>& props, const char (&key)[5]) -> Prop& {
        for (Prop& p : props)
            if (p.key == pi::fourCC(key)) return p;
        throw std::logic_error("no such property");
    };
    struct Case {
        Bytes resource;
        const char* reason;
    };
    const Case cases[] = {
        {Bytes{}, "PIPL ends inside the header (offset 0)"},
        {pipl(filterProps(), 0), "PIPL starts with 0, not 1"},
        {pipl(filterProps(), 1, 1), "PIPL version 1 is not supported (only 0)"},
        {pipl(filterProps(), 1, 0, 0x7fffffff), "PIPL claims 2147483647 properties"},
        {pipl(filterProps(), 1, 0, -1), "PIPL claims -1 properties"},
        {with([&](auto& p) { find(p, "name").storedLength = 0x7fffffff; }), "PIPL property 'name' claims 2147483647 bytes"},
        {with([&](auto& p) { find(p, "name").storedLength = -4; }), "PIPL property 'name' claims -4 bytes"},
        {with([&](auto& p) { find(p, "kind").data = u32le(pi::fourCC("8BFF")); }),
         "not a filter module (kind '8BFF', a filter is '8BFM')"},
        {with([&](auto& p) { find(p, "kind").vendor = pi::fourCC("ABCD"); }), "PIPL does not say what kind"},
        {with([&](auto& p) { find(p, "kind").data.clear(); }), "PIPL property 'kind' ends inside the kind"},
        {with([&](auto& p) { find(p, "vers").data = u32le(0x00040001); }),
         "module needs filter interface 4.1; this host provides 4.0"},
        {with([&](auto& p) { find(p, "vers").data = u32le(0x00050000); }), "module needs filter interface 5.0"},
        {with([&](auto& p) { find(p, "vers").key = pi::fourCC("verz"); }), "PIPL has no interface version ('vers')"},
        {with([&](auto& p) { find(p, "8664").key = pi::fourCC("wx86"); }), "PIPL names no x86-64 entry point ('8664')"},
        {with([&](auto& p) { find(p, "8664").data = cstrData(""); }), "PIPL names no x86-64 entry point ('8664')"},
        {with([&](auto& p) { find(p, "8664").data = {'E', 'N', 'T', 'R'}; }),
         "PIPL property '8664': unterminated entry point name"},
        {with([&](auto& p) { find(p, "name").data = {40, 'a', 'b'}; }), "PIPL property 'name' ends inside the name"},
        {with([&](auto& p) { find(p, "hstm").data.resize(12); }), "PIPL property 'hstm' ends inside the terminology id"},
        {with([&](auto& p) {
             find(p, "fici").data.resize(27);
             find(p, "fici").storedLength = 27;
         }), "PIPL property 'fici' ends inside the filter cases"},
        {with([&](auto& p) { find(p, "enbl").data = cstrData("in (PSHOP_ImageMode, FooMode)"); }),
         "enable expression \"in (PSHOP_ImageMode, FooMode)\": unknown name 'FooMode' at character 22"},
    };
    for (const Case& c : cases) {
        const std::string reason = errorOf([&] { parse(c.resource); });
        EXPECT_EQ(reason.rfind(c.reason, 0), 0u) << "got: " << reason << "\nwanted: " << c.reason;
    }
}

TEST(ModuleInfo, TerminologyMustNameAnEventOfTheAete) {
    auto props = filterProps();
    props[5].data = Out().u32(0).u32(pi::fourCC("othr")).u32(pi::fourCC("othr")).u16(16013).u8(0).b;
    EXPECT_EQ(errorOf([&] { parse(pipl(props), aete()); }),
              "AETE describes no event 'othr'/'othr', which the PIPL terminology names");
    EXPECT_FALSE(parse(pipl(props)).event);  // without an AETE there is simply no event

    Bytes wrongVersion = aete();
    wrongVersion[2] = 2;
    EXPECT_EQ(errorOf([&] { parse(pipl(filterProps()), wrongVersion); }), "AETE version 2 is not supported (only 1)");
}

// Every prefix of a valid resource, and of a valid module file, is refused with a reason.
TEST(ModuleInfo, TruncatedResourcesAndFilesAreRefusedAtEveryLength) {
    const Bytes p = pipl(filterProps());
    const Bytes a = aete();
    ASSERT_NO_THROW(parse(p, a));
    for (std::size_t n = 0; n < p.size(); ++n)
        EXPECT_FALSE(errorOf([&] { parse(Bytes(p.begin(), p.begin() + std::ptrdiff_t(n))); }).empty()) << n;
    for (std::size_t n = 0; n < a.size(); ++n)
        EXPECT_FALSE(errorOf([&] { parse(p, Bytes(a.begin(), a.begin() + std::ptrdiff_t(n))); }).empty()) << n;

    TempDir dir;
    for (std::size_t n = 0; n < p.size(); n += 1) {
        const fs::path f = writeBytes(dir, "pipl" + std::to_string(n), elf({{"PIPL", Bytes(p.begin(), p.begin() + std::ptrdiff_t(n))}}));
        EXPECT_FALSE(errorOf([&] { readModuleInfo(f); }).empty()) << n;
        fs::remove(f);
    }
    const Bytes file = elf({{".text", Bytes(40, 0x90)}, {"PIPL", p}, {"AETE", a}});
    const fs::path whole = writeBytes(dir, "whole.so", file);
    const ModuleInfo info = readModuleInfo(whole);
    EXPECT_EQ(info.name, "Test...");
    ASSERT_TRUE(info.event);
    EXPECT_EQ(info.event->name, "Test");
    for (std::size_t n = 0; n < file.size(); ++n) {
        const fs::path f = writeBytes(dir, "cut" + std::to_string(n), Bytes(file.begin(), file.begin() + std::ptrdiff_t(n)));
        EXPECT_FALSE(errorOf([&] { readModuleInfo(f); }).empty()) << n;
        fs::remove(f);
    }
}

TEST(ModuleInfo, MalformedElfFilesGiveClearReasons) {
    const Bytes good = elf({{"PIPL", pipl(filterProps())}});
    auto header = [&](auto change, Bytes f = {}) {
        if (f.empty()) f = good;
        Elf64_Ehdr e;
        std::memcpy(&e, f.data(), sizeof e);
        change(e);
        std::memcpy(f.data(), &e, sizeof e);
        return f;
    };
    // Section 1 is the PIPL, the last one the name table.
    auto section = [&](std::size_t index, auto change) {
        Bytes f = good;
        Elf64_Ehdr e;
        std::memcpy(&e, f.data(), sizeof e);
        Elf64_Shdr s;
        std::uint8_t* at = f.data() + e.e_shoff + index * sizeof s;
        std::memcpy(&s, at, sizeof s);
        change(s);
        std::memcpy(at, &s, sizeof s);
        return f;
    };
    struct Case {
        Bytes file;
        const char* reason;
    };
    const Case cases[] = {
        {Bytes{}, "empty file, not an ELF module"},
        {Out().str("#!/bin/sh\necho not a module\n").b, "not an ELF file"},
        {Bytes{0x7f, 'E', 'L'}, "not an ELF file"},
        {header([](Elf64_Ehdr& e) { e.e_ident[EI_CLASS] = ELFCLASS32; }), "not a 64-bit ELF file"},
        {header([](Elf64_Ehdr& e) { e.e_ident[EI_DATA] = ELFDATA2MSB; }), "not a little-endian ELF file"},
        {Bytes(good.begin(), good.begin() + 40), "truncated ELF header"},
        {header([](Elf64_Ehdr& e) { e.e_shoff = 0; }), "no PIPL resource"},
        {header([](Elf64_Ehdr& e) { e.e_shoff = ~0ull - 8; }), "ELF section table lies outside the file"},
        {header([](Elf64_Ehdr& e) { e.e_shnum = 0xFFFF; }), "ELF section table lies outside the file"},
        {header([](Elf64_Ehdr& e) { e.e_shentsize = 40; }), "unexpected ELF section header size 40"},
        {header([](Elf64_Ehdr& e) { e.e_shstrndx = 200; }), "ELF file has no section name table"},
        // A section count of 0 defers to the first section header's size.
        {header([](Elf64_Ehdr& e) { e.e_shnum = 0; }, section(0, [](Elf64_Shdr& s) { s.sh_size = ~0ull / 2; })),
         "ELF section table lies outside the file"},
        {section(1, [](Elf64_Shdr& s) { s.sh_offset = ~0ull - 4; }), "section PIPL lies outside the file"},
        {section(1, [](Elf64_Shdr& s) { s.sh_size = ~0ull; }), "section PIPL lies outside the file"},
        {section(1, [](Elf64_Shdr& s) { s.sh_type = SHT_NOBITS; }), "section PIPL has no contents in the file"},
        {section(1, [](Elf64_Shdr& s) { s.sh_name = 0x7fffffff; }), "no PIPL resource"},
        {section(2, [](Elf64_Shdr& s) { s.sh_size = 7; }), "unterminated ELF section name"},
        {section(2, [](Elf64_Shdr& s) { s.sh_offset = 1ull << 40; }), "ELF section name table lies outside the file"},
    };
    TempDir dir;
    int i = 0;
    for (const Case& c : cases) {
        const fs::path f = writeBytes(dir, "case" + std::to_string(i++), c.file);
        const std::string reason = errorOf([&] { readModuleInfo(f); });
        EXPECT_EQ(reason.rfind(c.reason, 0), 0u) << "case " << i - 1 << " got: " << reason << "\nwanted: " << c.reason;
    }
    EXPECT_EQ(errorOf([&] { readModuleInfo(dir.path() / "absent.so"); }).rfind("cannot read module file", 0), 0u);
}

namespace {
std::intptr_t gSeenWindow = -1;
std::optional<std::string> gWindowInfo;
std::string gDisplay;

// Records the parent window at Prepare and asks the X server about it while the run is on.
void windowEntry(pi::int16 selector, pi::FilterRecord* record, intptr_t*, pi::int16* result) {
    if (selector == pi::filterSelectorPrepare) {
        pi::PlatformData* platform = record->platformData;
        gSeenWindow = platform ? platform->hwnd : -1;
        if (gSeenWindow > 0 && !gDisplay.empty())
            gWindowInfo = runShell("xwininfo -display " + gDisplay + " -id " + std::to_string(gSeenWindow));
    }
    *result = pi::noErr;
}
}  // namespace

TEST(ParentWindow, NoDisplayGivesZero) {
    vek::testing::ScopedEnv none("DISPLAY", nullptr);
    EXPECT_FALSE(ParentWindow::open());
    Image image(2, 2, 3, 8);
    gSeenWindow = -1;
    const RunResult r = runFilter(&windowEntry, image);
    EXPECT_TRUE(r.ok()) << r.message();
    EXPECT_EQ(gSeenWindow, 0);
    EXPECT_EQ(r.parentWindow, 0);

    vek::testing::ScopedEnv unreachable("DISPLAY", ":9999");  // nothing listens there
    EXPECT_FALSE(ParentWindow::open());
}

TEST(ParentWindow, DisplayGivesAWindowForTheRunOnly) {
    if (!runShell("command -v Xvfb >/dev/null && command -v xwininfo >/dev/null")) GTEST_SKIP() << "Xvfb or xwininfo missing";
    XvfbServer server;
    if (server.display().empty()) GTEST_SKIP() << "Xvfb could not be started";
    vek::testing::ScopedEnv display("DISPLAY", server.display().c_str());
    gDisplay = server.display();
    gSeenWindow = -1;
    gWindowInfo.reset();
    Image image(2, 2, 3, 8);
    const RunResult r = runFilter(&windowEntry, image);
    EXPECT_TRUE(r.ok()) << r.message();
    EXPECT_GT(gSeenWindow, 0);
    EXPECT_EQ(r.parentWindow, gSeenWindow);
    ASSERT_TRUE(gWindowInfo);
    EXPECT_NE(gWindowInfo->find("\"noctiva host\""), std::string::npos) << *gWindowInfo;
    // Destroyed with the run.
    EXPECT_FALSE(runShell("xwininfo -display " + gDisplay + " -id " + std::to_string(gSeenWindow) + " 2>/dev/null"));

    RunOptions noWindow;
    noWindow.parentWindow = false;
    gSeenWindow = -1;
    EXPECT_TRUE(runFilter(&windowEntry, image, noWindow).ok());
    EXPECT_EQ(gSeenWindow, 0);
    gDisplay.clear();
}

// The PIPL found in the module file, checked against a layout assembled here by hand from the
// resource tables (not from the module's own generator). The AETE is read back through the host's
// parser in tests/host (ModuleInfo.RealModule...).
#include <gtest/gtest.h>

#include <cstdio>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <string>
#include <vector>

namespace {

using Bytes = std::vector<uint8_t>;

struct Assembler {
    Bytes b;
    void u8(int v) { b.push_back(uint8_t(v)); }
    void u16(int v) { u8(v & 0xFF), u8((v >> 8) & 0xFF); }
    void u32(uint32_t v) { u16(int(v & 0xFFFF)), u16(int(v >> 16)); }
    // Four-character codes are little-endian integers: "8BIM" is stored as "MIB8".
    void code(const char* c) { u32(uint32_t(uint8_t(c[0])) << 24 | uint32_t(uint8_t(c[1])) << 16 | uint32_t(uint8_t(c[2])) << 8 | uint8_t(c[3])); }
    void text(const std::string& s) { b.insert(b.end(), s.begin(), s.end()); }
    void pstr(const std::string& s) { u8(int(s.size())), text(s); }
    void prop(const char* key, const Bytes& data) {
        code("8BIM"), code(key), u32(0);
        const size_t padded = (data.size() + 3) / 4 * 4;
        u32(uint32_t(padded));
        b.insert(b.end(), data.begin(), data.end());
        b.resize(b.size() + padded - data.size(), 0);
    }
};

Bytes expectedPIPL() {
    Assembler a;
    a.u16(1), a.u32(0), a.u32(10);
    auto data = [](auto fill) { Assembler d; fill(d); return d.b; };
    a.prop("kind", data([](Assembler& d) { d.code("8BFM"); }));
    a.prop("name", data([](Assembler& d) { d.pstr("Noctiva..."); }));
    a.prop("catg", data([](Assembler& d) { d.pstr("**Hidden**"); }));
    a.prop("vers", data([](Assembler& d) { d.u16(0), d.u16(4); }));
    a.prop("8664", data([](Assembler& d) { d.text("ENTRYPOINT"), d.u8(0); }));
    a.prop("hstm", data([](Assembler& d) { d.u32(0), d.code("qv06"), d.code("qv06"), d.u16(16013), d.u8(0); }));
    a.prop("mode", data([](Assembler& d) { d.u8(0x10), d.u8(0); }));
    a.prop("enbl", data([](Assembler& d) { d.text("in (PSHOP_ImageMode, RGBMode, RGB48Mode)"), d.u8(0); }));
    a.prop("flly", data([](Assembler& d) { d.u8(0x80); }));
    a.prop("fici", data([](Assembler& d) {
        for (int i = 0; i < 7; ++i) d.u8(1), d.u8(1), d.u8(6), d.u8(0);
    }));
    return a.b;
}

Bytes dumpSection(const std::string& name) {
    const auto out = std::filesystem::temp_directory_path() / ("noctiva-" + name + "-" + std::to_string(::getpid()));
    const std::string cmd = "objcopy --dump-section " + name + "=" + out.string() + " " NOCTIVA_MODULE_PATH " /dev/null";
    if (std::system(cmd.c_str()) != 0) return {};
    std::ifstream in(out, std::ios::binary);
    Bytes bytes{std::istreambuf_iterator<char>(in), {}};
    std::filesystem::remove(out);
    return bytes;
}

TEST(Resources, PIPLSectionMatchesTheTable) { EXPECT_EQ(dumpSection("PIPL"), expectedPIPL()); }

}  // namespace

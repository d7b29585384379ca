// Build-machine tool: writes the module's PIPL and AETE bytes, from the same description as the
// Linux sections, and the resource script that gives them their types, IDs and language.
#include <cstdio>
#include <fstream>
#include <iostream>
#include <string>

#include "plugin/Resources.h"

namespace {

template <typename Bytes>
bool writeFile(const std::string& path, const Bytes& bytes) {
    std::ofstream out(path, std::ios::binary | std::ios::trunc);
    out.write(reinterpret_cast<const char*>(bytes.data()), std::streamsize(bytes.size()));
    return bool(out);
}

}  // namespace

int main(int argc, char** argv) {
    if (argc != 4) {
        std::cerr << "usage: " << argv[0] << " PIPL.bin AETE.bin OUT.rc\n";
        return 2;
    }
    const std::string pipl = argv[1], aete = argv[2], rc = argv[3];
    if (!writeFile(pipl, resources::buildPIPL()) || !writeFile(aete, resources::buildAETE())) {
        std::cerr << "cannot write the resource data\n";
        return 1;
    }
    // LANGUAGE takes the primary and sub-language; 1033 is 0x0409.
    const unsigned language = resources::kResourceLanguage;
    std::ofstream out(rc, std::ios::trunc);
    char line[64];
    std::snprintf(line, sizeof line, "LANGUAGE 0x%02X, 0x%02X\n", language & 0x3FF, language >> 10);
    out << line;
    out << resources::kPIPLResourceId << " PIPL \"" << pipl << "\"\n";
    out << resources::kAETEResourceId << " AETE \"" << aete << "\"\n";
    if (!out) {
        std::cerr << "cannot write " << rc << "\n";
        return 1;
    }
    return 0;
}

#include "ElfSections.h"

#include <elf.h>

#include <cstring>
#include <fstream>
#include <system_error>

#include "noctiva/host/Error.h"

namespace noctiva::host {

namespace {

// Ranged reads of an untrusted file: every request is checked against the file's size first.
class FileRanges {
public:
    explicit FileRanges(const std::filesystem::path& path) : path_(path), in_(path, std::ios::binary) {
        std::error_code ec;
        size_ = std::filesystem::file_size(path, ec);
        if (ec || !in_) throw HostError(path.string(), "cannot read module file" + (ec ? ": " + ec.message() : ""));
    }

    std::uint64_t size() const { return size_; }
    bool contains(std::uint64_t offset, std::uint64_t length) const {
        return offset <= size_ && length <= size_ - offset;
    }
    std::vector<std::uint8_t> read(std::uint64_t offset, std::uint64_t length, const std::string& what) {
        if (!contains(offset, length)) fail(what + " lies outside the file");
        std::vector<std::uint8_t> bytes(static_cast<std::size_t>(length));
        in_.seekg(std::streamoff(offset));
        if (length > 0 && !in_.read(reinterpret_cast<char*>(bytes.data()), std::streamsize(length)))
            fail("cannot read " + what);
        return bytes;
    }
    template <typename T>
    T readStruct(std::uint64_t offset, const std::string& what) {
        const auto bytes = read(offset, sizeof(T), what);
        T value;
        std::memcpy(&value, bytes.data(), sizeof(T));
        return value;
    }
    [[noreturn]] void fail(const std::string& reason) const { throw HostError(path_.string(), reason); }

private:
    std::filesystem::path path_;
    std::ifstream in_;
    std::uint64_t size_ = 0;
};

}  // namespace

std::vector<std::optional<std::vector<std::uint8_t>>> readElfSections(const std::filesystem::path& path,
                                                                      const std::vector<std::string>& names) {
    FileRanges file(path);
    std::vector<std::optional<std::vector<std::uint8_t>>> found(names.size());

    if (file.size() == 0) file.fail("empty file, not an ELF module");
    if (file.size() < EI_NIDENT) file.fail("not an ELF file");
    const auto ident = file.read(0, EI_NIDENT, "ELF identification");
    if (std::memcmp(ident.data(), ELFMAG, SELFMAG) != 0) file.fail("not an ELF file");
    if (ident[EI_CLASS] != ELFCLASS64) file.fail("not a 64-bit ELF file");
    if (ident[EI_DATA] != ELFDATA2LSB) file.fail("not a little-endian ELF file");
    if (file.size() < sizeof(Elf64_Ehdr)) file.fail("truncated ELF header");
    const auto header = file.readStruct<Elf64_Ehdr>(0, "ELF header");

    // A file without a section table (fully stripped) simply has none of the sections.
    if (header.e_shoff == 0) return found;
    if (header.e_shentsize != sizeof(Elf64_Shdr))
        file.fail("unexpected ELF section header size " + std::to_string(header.e_shentsize));

    // Large section counts and string-table indexes live in the first section header.
    std::uint64_t count = header.e_shnum;
    std::uint64_t namesIndex = header.e_shstrndx;
    if (count == 0 || namesIndex == SHN_XINDEX) {
        const auto first = file.readStruct<Elf64_Shdr>(header.e_shoff, "ELF section table");
        if (count == 0) count = first.sh_size;
        if (namesIndex == SHN_XINDEX) namesIndex = first.sh_link;
    }
    if (count == 0) return found;
    if (!file.contains(header.e_shoff, 0) || count > (file.size() - header.e_shoff) / sizeof(Elf64_Shdr))
        file.fail("ELF section table lies outside the file");
    const auto tableBytes = file.read(header.e_shoff, count * sizeof(Elf64_Shdr), "ELF section table");
    std::vector<Elf64_Shdr> table(static_cast<std::size_t>(count));
    std::memcpy(table.data(), tableBytes.data(), tableBytes.size());

    if (namesIndex == SHN_UNDEF || namesIndex >= count) file.fail("ELF file has no section name table");
    const Elf64_Shdr& namesHeader = table[std::size_t(namesIndex)];
    if (namesHeader.sh_type == SHT_NOBITS) file.fail("ELF section name table has no contents");
    const auto sectionNames = file.read(namesHeader.sh_offset, namesHeader.sh_size, "ELF section name table");

    for (const Elf64_Shdr& section : table) {
        if (section.sh_name >= sectionNames.size()) continue;  // index 0 and names past the table
        const auto* start = reinterpret_cast<const char*>(sectionNames.data()) + section.sh_name;
        const std::size_t room = sectionNames.size() - section.sh_name;
        const std::size_t length = strnlen(start, room);
        if (length == room) file.fail("unterminated ELF section name");
        const std::string_view name(start, length);
        for (std::size_t i = 0; i < names.size(); ++i) {
            if (found[i] || name != names[i]) continue;
            if (section.sh_type == SHT_NOBITS) file.fail("section " + names[i] + " has no contents in the file");
            found[i] = file.read(section.sh_offset, section.sh_size, "section " + names[i]);
        }
    }
    return found;
}

}  // namespace noctiva::host

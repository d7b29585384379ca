#include "kernel/Parameter.h"

#include <cstdio>
#include <cstdlib>
#include <cstring>

namespace VEK_STD {

int32_t parameterCounter = 0;

namespace {

constexpr char kUnnamedPrefix[] = "Parameter";
// "Parameter" + the longest int32 in decimal.
constexpr size_t kUnnamedLengthBound = sizeof(kUnnamedPrefix) - 1 + 11;
constexpr size_t kIntValueBound = 11;

// Appends `entry` when it fits with its terminator; otherwise leaves the buffer as it was.
void appendBounded(char* buffer, size_t capacity, char*& cursor, const std::string& entry) {
    if (buffer == nullptr || cursor == nullptr || cursor < buffer) return;
    const size_t used = size_t(cursor - buffer);
    if (used >= capacity) return;
    if (entry.size() + 1 > capacity - used) {
        *cursor = '\0';
        return;
    }
    std::memcpy(cursor, entry.data(), entry.size());
    cursor += entry.size();
    *cursor = '\0';
}

}  // namespace

cParameter::cParameter(void* target, uint32_t size, bool serialised, const char* name)
    : serialised(serialised), name(name), target(target), size(size), snapshot(new uint8_t[size ? size : 1]()) {}

bool cParameter::HasChanged() const { return std::memcmp(target, snapshot.get(), size) != 0; }

void cParameter::AcceptChanges() { std::memcpy(snapshot.get(), target, size); }

std::string cParameter::EntryName(int32_t counter) const {
    if (name != nullptr) return name;
    char text[kUnnamedLengthBound + 1];
    std::snprintf(text, sizeof text, "%s%i%s", kUnnamedPrefix, int(counter), "");
    return text;
}

size_t cParameter::NameLengthBound() const { return name != nullptr ? std::strlen(name) : kUnnamedLengthBound; }

size_t cParameter::TextLength() const {
    if (!serialised) return 0;
    // blank, name, blank, quote, every byte escaped to two, quote, blank
    return 1 + NameLengthBound() + 2 + 2 * size_t(size) + 2;
}

void cParameter::Write(char* buffer, size_t capacity, char*& cursor, int32_t& counter) {
    if (!serialised) return;
    std::string escapedBytes;
    escapedBytes.reserve(2 * size_t(size));
    const auto* bytes = static_cast<const uint8_t*>(target);
    for (uint32_t i = 0; i < size; ++i) {
        const char c = char(bytes[i]);
        if (bytes[i] == escaped) {
            escapedBytes += escape;
            escapedBytes += zeroEscape;
        } else {
            if (c == quote || c == escape) escapedBytes += escape;
            escapedBytes += c;
        }
    }
    const std::string entry = " " + EntryName(counter) + " " + quote + escapedBytes + quote + " ";
    appendBounded(buffer, capacity, cursor, entry);
    ++counter;
}

void cParameter::Read(const char* text, const char*& cursor, int32_t& counter) {
    if (!serialised) return;
    const std::string entryName = EntryName(counter);
    ++counter;
    if (cursor == nullptr) return;
    const char* found = std::strstr(cursor, entryName.c_str());
    if (found == nullptr) return;
    const char* p = std::strchr(found + entryName.size(), quote);
    if (p == nullptr) {
        cursor = found + entryName.size();
        return;
    }
    ++p;
    auto* bytes = static_cast<uint8_t*>(target);
    uint32_t written = 0;
    // The decoded length is capped at `size` whatever the text holds.
    while (*p != '\0' && *p != quote) {
        char c = *p++;
        if (c == escape && *p != '\0') {
            c = *p++;
            if (c == zeroEscape) c = char(escaped);
        }
        if (written < size) bytes[written++] = uint8_t(c);
    }
    if (*p == quote) ++p;
    cursor = p;
}

cIntParameter::cIntParameter(int32_t* field, bool serialised, const char* name)
    : cParameter(field, sizeof(int32_t), serialised, name), field(field) {}

size_t cIntParameter::TextLength() const {
    if (!serialised) return 0;
    return 1 + NameLengthBound() + 1 + kIntValueBound + 1;
}

void cIntParameter::Write(char* buffer, size_t capacity, char*& cursor, int32_t& counter) {
    if (!serialised) return;
    char entry[1 + kUnnamedLengthBound + 1 + kIntValueBound + 2];
    const std::string entryName = EntryName(counter);
    if (entryName.size() <= kUnnamedLengthBound) {
        std::snprintf(entry, sizeof entry, "%s%s%s%i%s", " ", entryName.c_str(), " ", int(*field), " ");
        appendBounded(buffer, capacity, cursor, entry);
    } else {
        appendBounded(buffer, capacity, cursor, " " + entryName + " " + std::to_string(*field) + " ");
    }
    ++counter;
}

void cIntParameter::Read(const char* text, const char*& cursor, int32_t& counter) {
    if (!serialised) return;
    const std::string entryName = EntryName(counter);
    ++counter;
    if (cursor == nullptr) return;
    // A plain substring search: the name of entry 5 also matches the start of "Parameter50".
    const char* found = std::strstr(cursor, entryName.c_str());
    if (found == nullptr) return;
    const char* after = found + entryName.size();
    // strtol stops at the terminator; values beyond int32 are saturated rather than wrapped.
    const long value = std::strtol(after, nullptr, 10);
    *field = value > INT32_MAX ? INT32_MAX : value < INT32_MIN ? INT32_MIN : int32_t(value);
    cursor = after;
}

cParameterSet::~cParameterSet() {
    for (auto* p : members) cAbstractParameter::Delete(p);
}

void cParameterSet::Add(cAbstractParameter* parameter) {
    if (parameter != nullptr) members.push_back(parameter);
}

bool cParameterSet::HasChanged() const {
    for (const auto* p : members)
        if (p->HasChanged()) return true;
    return false;
}

void cParameterSet::AcceptChanges() {
    for (auto* p : members) p->AcceptChanges();
}

bool cParameterSet::Watches(const void* address) const {
    for (const auto* p : members)
        if (p->Watches(address)) return true;
    return false;
}

void cParameterSet::Read(const char* text, const char*& cursor, int32_t& counter) {
    for (auto* p : members) p->Read(text, cursor, counter);
}

void cParameterSet::Write(char* buffer, size_t capacity, char*& cursor, int32_t& counter) {
    for (auto* p : members) p->Write(buffer, capacity, cursor, counter);
}

size_t cParameterSet::TextLength() const {
    size_t n = 0;
    for (const auto* p : members) n += p->TextLength();
    return n;
}

std::unique_ptr<char[]> cParameterSet::WriteToNewBuffer(int32_t& counter) {
    const size_t capacity = TextLength() + 1;
    std::unique_ptr<char[]> buffer(new char[capacity]());
    char* cursor = buffer.get();
    Write(buffer.get(), capacity, cursor, counter);
    return buffer;
}

}  // namespace VEK_STD

#include "kernel/ColorTable.h"

#include <cstring>
#include <map>
#include <new>

#include "kernel/Memory/MEM.h"
#include "kernel/Types.h"

namespace KERNEL {

namespace {

constexpr uint32_t kTableBytes = 1048576;

int32_t channelsOf(int32_t mode) { return (mode >= 0 && mode < kModeCount) ? modeChannels[mode] : 0; }

bool isPrime(uint32_t n) {
    for (uint32_t d = 2; d <= n / d; ++d)
        if (n % d == 0) return false;
    return true;
}

}  // namespace

uint32_t cStandardColorTable::primeCapacity(uint32_t n) {
    while (n > 1 && !isPrime(n)) --n;
    return n > 0 ? n : 1;
}

cStandardColorTable::cStandardColorTable(int32_t from, int32_t to, int16_t* componentBuffer) {
    initModeTables();
    probeCount = 7;
    fromMode = uint32_t(from);
    toMode = uint32_t(to);
    keyBytes = int8_t(channelsOf(from));
    entrySize = int8_t(channelsOf(from) + channelsOf(to));
    // Modes without colour components have nothing to key on; such a table caches nothing.
    if (componentBuffer == nullptr || keyBytes <= 0) return;

    capacity = primeCapacity(kTableBytes / uint32_t(entrySize));
    fillLimit = int32_t(double(float(capacity)) * 0.8);
    fillCount = 0;
    auto* bytes = reinterpret_cast<uint8_t*>(componentBuffer);
    for (int k = 0; k < 4; ++k) components[k] = bytes + 2 * k;

    // A host short of memory gets a smaller table; one that cannot spare a single entry gets none.
    for (;;) {
        try {
            memory = std::make_unique<cMEM>(uint32_t(entrySize) * capacity);
            break;
        } catch (const cMEMException&) {
            if (capacity <= 1) {
                capacity = 0;
                return;
            }
            capacity = primeCapacity(capacity - 1);
        }
    }
    entries = static_cast<uint8_t*>(memory->Lock());
    if (entries == nullptr) return;
    wipe();
}

cStandardColorTable::~cStandardColorTable() {
    entries = nullptr;
    // The handle unlocks and frees itself.
}

void cStandardColorTable::wipe() {
    std::memset(entries, 0, size_t(uint8_t(entrySize)) * capacity);
    fillCount = 0;
}

bool cStandardColorTable::lookup() {
    pendingValid = false;
    if (entries == nullptr) return false;
    uint8_t key[4] = {0, 0, 0, 0};
    // Signed key bytes, wrapped modulo 2^32 (a byte of 200 adds -56).
    uint32_t k = 0;
    for (int i = 0; i < keyBytes; ++i) {
        key[i] = *components[i];
        k = k * 256u + uint32_t(int32_t(int8_t(key[i])));
    }
    const uint32_t h = k % capacity;
    probeBase = h;
    // A first key byte of 0 is the free-entry marker: such colours would match empty slots, so they
    // always go to the host.
    if (key[0] == 0) return false;

    for (uint32_t i = 1; i <= uint32_t(probeCount); ++i) {
        const uint8_t* e = entryAt(uint32_t((uint64_t(h) * i) % capacity));
        if (std::memcmp(e, key, size_t(keyBytes)) == 0) {
            for (int r = 0; r < resultBytes(); ++r) *components[r] = e[keyBytes + r];
            return true;
        }
    }
    for (int i = 0; i < 4; ++i) pendingKey[i] = *components[i];
    pendingValid = true;
    return false;
}

void cStandardColorTable::store() {
    if (entries == nullptr || !pendingValid) return;
    pendingValid = false;
    for (uint32_t i = 1; i <= uint32_t(probeCount); ++i) {
        uint8_t* e = entryAt(uint32_t((uint64_t(probeBase) * i) % capacity));
        if (e[0] == 0) {
            std::memcpy(e, pendingKey, size_t(keyBytes));
            for (int r = 0; r < resultBytes(); ++r) e[keyBytes + r] = *components[r];
            ++fillCount;
            return;
        }
    }
    // Seven used slots: a table past its fill limit starts over; the colour itself is not kept.
    if (fillCount > fillLimit) wipe();
}

// ---------------------------------------------------------------------------------------------------

namespace {
using TableMap = std::map<uint32_t, std::unique_ptr<cColorTable>>;
std::unique_ptr<TableMap> g_tables;
int32_t g_factoryCount = 0;
}  // namespace

cColorTableFactory::cColorTableFactory() {
    if (!g_tables) g_tables = std::make_unique<TableMap>();
    ++g_factoryCount;
}

cColorTableFactory::~cColorTableFactory() {
    if (--g_factoryCount == 0) g_tables.reset();
}

cColorTable* cColorTableFactory::getTable(int32_t fromMode, int32_t toMode, int16_t* componentBuffer) {
    if (!g_tables) g_tables = std::make_unique<TableMap>();
    const uint32_t key = uint32_t(fromMode) * 256u + uint32_t(toMode);
    if (auto it = g_tables->find(key); it != g_tables->end()) return it->second.get();
    // Inserted only once built, so a failed construction leaves no empty slot behind.
    cColorTable* table = createTable(fromMode, toMode, componentBuffer);
    if (table != nullptr) g_tables->emplace(key, std::unique_ptr<cColorTable>(table));
    return table;
}

cColorTable* cColorTableFactory::createTable(int32_t fromMode, int32_t toMode, int16_t* componentBuffer) {
    if (fromMode == kModeLab || toMode == kModeLab) return new (std::nothrow) cDummyColorTable;
    return new (std::nothrow) cStandardColorTable(fromMode, toMode, componentBuffer);
}

int32_t cColorTableFactory::liveFactories() { return g_factoryCount; }
size_t cColorTableFactory::sharedTableCount() { return g_tables ? g_tables->size() : 0; }

}  // namespace KERNEL

// Caches in front of the host's colour services: one table per pair of modes remembers which output
// colour the host gave for an input colour, so the host is asked once per distinct colour.
#pragma once

#include <cstdint>
#include <memory>

namespace KERNEL {

class cMEM;

// Works on the low bytes of the conversion object's four int16 colour components.
class cColorTable {
public:
    virtual ~cColorTable() = default;
    // On a hit writes the cached result into the components and returns true.
    virtual bool lookup() = 0;
    // Records the colour of the last missed lookup with the result now in the components.
    virtual void store() = 0;
};

// Used whenever Lab (mode 9) is on either side: every colour goes to the host.
class cDummyColorTable : public cColorTable {
public:
    bool lookup() override { return false; }
    void store() override {}
};

// Open-addressing hash table in one host memory block of at most 1 MiB, prime capacity, seven
// multiplicative probes. An entry is the key (input colour) followed by the result; first byte 0 = free.
class cStandardColorTable : public cColorTable {
public:
    cStandardColorTable(int32_t fromMode, int32_t toMode, int16_t* componentBuffer);
    ~cStandardColorTable() override;
    cStandardColorTable(const cStandardColorTable&) = delete;
    cStandardColorTable& operator=(const cStandardColorTable&) = delete;

    bool lookup() override;
    void store() override;

    // Largest prime <= n (1 for n < 2): the table's capacity search.
    static uint32_t primeCapacity(uint32_t n);
    // False when not even one entry could be allocated; the table then caches nothing.
    bool usable() const { return entries != nullptr; }

    uint8_t* entries = nullptr;
    std::unique_ptr<cMEM> memory;
    int8_t keyBytes = 0;
    int8_t entrySize = 0;
    int8_t probeCount = 7;
    uint32_t capacity = 0;
    uint8_t* components[4] = {nullptr, nullptr, nullptr, nullptr};
    uint8_t pendingKey[4] = {0, 0, 0, 0};
    int32_t fillLimit = 0;
    int32_t fillCount = 0;
    uint32_t fromMode = 0;
    uint32_t toMode = 0;
    uint32_t probeBase = 0;

private:
    uint8_t* entryAt(uint32_t index) const { return entries + size_t(index) * uint8_t(entrySize); }
    int32_t resultBytes() const { return entrySize - keyBytes; }
    void wipe();
    // Set by a lookup that missed on a cacheable colour; consumed by store.
    bool pendingValid = false;
};

// Hands out one table per pair of modes. All factories share one module-wide map; the tables live
// until the last factory is destroyed.
class cColorTableFactory {
public:
    cColorTableFactory();
    virtual ~cColorTableFactory();
    cColorTableFactory(const cColorTableFactory&) = delete;
    cColorTableFactory& operator=(const cColorTableFactory&) = delete;

    // The shared table for the pair, created on first request with `componentBuffer` (which must outlive
    // it). Never null for a factory whose createTable never returns null.
    virtual cColorTable* getTable(int32_t fromMode, int32_t toMode, int16_t* componentBuffer);
    virtual cColorTable* createTable(int32_t fromMode, int32_t toMode, int16_t* componentBuffer);

    static int32_t liveFactories();
    static size_t sharedTableCount();
};

}  // namespace KERNEL

// Colour tables: capacity search, sharing through the factory, the cache in front of a counting host
// conversion, the fill-limit wipe, uncacheable colours, and degraded tables when memory is refused.
#include <map>
#include <tuple>

#include "BlockTestSupport.h"
#include "kernel/ColorTable.h"

using namespace KERNEL;
using blocktest::BlockPtr;
using blocktest::sample;
using blocktest::Wrapped;

namespace {

bool isPrime(uint32_t n) {
    if (n < 2) return false;
    for (uint32_t d = 2; d * d <= n; ++d)
        if (n % d == 0) return false;
    return true;
}

// Stand-in for the host's colour services: a naive RGB -> CMYK on 8-bit components.
void fakeHostConvert(int16_t* c) {
    const int r = c[0] & 0xFF, g = c[1] & 0xFF, b = c[2] & 0xFF;
    c[0] = int16_t(255 - r);
    c[1] = int16_t(255 - g);
    c[2] = int16_t(255 - b);
    c[3] = int16_t(std::min({255 - r, 255 - g, 255 - b}) / 2);
}

// Plays the plug-in's conversion object: asks its table first, the "host" only on a miss.
class TableConversion : public cColorConversion {
public:
    explicit TableConversion(cColorTableFactory*& f) : factory(f) {}
    void Prepare(int32_t s, int32_t r) { table = factory ? factory->getTable(s, r, components) : nullptr; }
    void Convert() override {
        if (table && table->lookup()) return;
        ++hostCalls;
        fakeHostConvert(components);
        if (table) table->store();
    }
    int16_t* GetComponents() override { return components; }

    cColorTableFactory*& factory;
    cColorTable* table = nullptr;
    int16_t components[4] = {0, 0, 0, 0};
    int hostCalls = 0;
};

class TableHost : public testsupport::MallocHost {
public:
    cColorConversion* GetColorConversion(int32_t s, int32_t r) override {
        conversion.Prepare(s, r);
        return &conversion;
    }
    cColorTableFactory* tables = nullptr;
    TableConversion conversion{tables};
};

class ColorTableTest : public ::testing::Test {
protected:
    void SetUp() override { initModeTables(); }
    void TearDown() override {
        factory.reset();
        EXPECT_EQ(cColorTableFactory::liveFactories(), 0);
        EXPECT_EQ(host.liveBuffers(), 0u) << "host buffers leaked";
    }
    cColorTableFactory& makeFactory() {
        factory = std::make_unique<cColorTableFactory>();
        host.tables = factory.get();
        return *factory;
    }
    // Puts an 8-bit colour into the components, as the converter does.
    void setColor(int16_t* c, int r, int g, int b) {
        c[0] = int16_t(r);
        c[1] = int16_t(g);
        c[2] = int16_t(b);
        c[3] = 0;
    }

    TableHost host;
    std::unique_ptr<cColorTableFactory> factory;
};

TEST_F(ColorTableTest, PrimeCapacitySearch) {
    const std::pair<uint32_t, uint32_t> cases[] = {{0, 1}, {1, 1}, {2, 2}, {3, 3}, {4, 3}, {10, 7}, {25, 23}, {49, 47}};
    for (auto [n, p] : cases) EXPECT_EQ(cStandardColorTable::primeCapacity(n), p) << n;
}

TEST_F(ColorTableTest, CapacityAndFillLimitFollowTheEntrySize) {
    const struct {
        int32_t from, to;
        int entrySize;
        uint32_t capacity;
        int32_t fillLimit;
    } cases[] = {
        {kModeRGB, kModeCMYK, 7, 149791, 119832},
        {kModeRGB, kModeRGB, 6, 174761, 139808},
        {kModeGray, kModeGray, 2, 524287, 419429},
        {kModeCMYK, kModeRGB16, 7, 149791, 119832},
    };
    int16_t components[4] = {};
    for (const auto& t : cases) {
        cStandardColorTable table(t.from, t.to, components);
        EXPECT_EQ(table.entrySize, t.entrySize);
        EXPECT_EQ(table.capacity, t.capacity);
        EXPECT_EQ(table.fillLimit, t.fillLimit);
        EXPECT_EQ(table.probeCount, 7);
        ASSERT_TRUE(table.usable());
        EXPECT_EQ(table.memory->Size(), uint32_t(t.entrySize) * t.capacity);
    }
}

TEST_F(ColorTableTest, LabOnEitherSideGetsADummyTable) {
    auto& f = makeFactory();
    int16_t components[4] = {};
    for (auto [from, to] : {std::pair{kModeLab, kModeRGB}, std::pair{kModeCMYK, kModeLab}}) {
        cColorTable* table = f.getTable(from, to, components);
        ASSERT_NE(dynamic_cast<cDummyColorTable*>(table), nullptr);
        setColor(components, 10, 20, 30);
        EXPECT_FALSE(table->lookup());
        table->store();
        EXPECT_FALSE(table->lookup());
    }
    EXPECT_NE(dynamic_cast<cStandardColorTable*>(f.getTable(kModeRGB, kModeCMYK, components)), nullptr);
}

TEST_F(ColorTableTest, TablesAreSharedAcrossFactoriesAndRecreatedEmpty) {
    int16_t components[4] = {};
    auto first = std::make_unique<cColorTableFactory>();
    auto second = std::make_unique<cColorTableFactory>();
    cColorTable* a = first->getTable(kModeRGB, kModeCMYK, components);
    EXPECT_EQ(second->getTable(kModeRGB, kModeCMYK, nullptr), a) << "the buffer matters only at creation";
    EXPECT_NE(second->getTable(kModeCMYK, kModeRGB, components), a);
    EXPECT_EQ(cColorTableFactory::liveFactories(), 2);
    EXPECT_EQ(cColorTableFactory::sharedTableCount(), 2u);

    setColor(components, 40, 50, 60);
    EXPECT_FALSE(a->lookup());
    fakeHostConvert(components);
    a->store();
    setColor(components, 40, 50, 60);
    EXPECT_TRUE(a->lookup());

    first.reset();
    EXPECT_EQ(second->getTable(kModeRGB, kModeCMYK, components), a) << "one factory still lives";
    second.reset();
    EXPECT_EQ(cColorTableFactory::sharedTableCount(), 0u);
    EXPECT_EQ(host.liveBuffers(), 0u) << "the last factory frees the tables";

    auto third = std::make_unique<cColorTableFactory>();
    auto* fresh = dynamic_cast<cStandardColorTable*>(third->getTable(kModeRGB, kModeCMYK, components));
    ASSERT_NE(fresh, nullptr);
    EXPECT_EQ(fresh->fillCount, 0);
    setColor(components, 40, 50, 60);
    EXPECT_FALSE(fresh->lookup()) << "a recreated table starts empty";
}

TEST_F(ColorTableTest, BlockConversionAsksTheHostOncePerDistinctColour) {
    makeFactory();
    // 24 x 10 pixels cycling through 37 colours; some have a red of 0 (the free-entry marker).
    const int width = 24, height = 10, distinct = 37;
    Wrapped rgb(kModeRGB, 1, 3, width, height);
    std::map<std::tuple<int, int, int>, int> occurrences;
    int zeroRedPixels = 0;
    for (int r = 0; r < height; ++r)
        for (int c = 0; c < width; ++c) {
            const int i = (r * width + c) % distinct;
            const int red = (i % 5 == 0) ? 0 : i * 6, green = 255 - i * 3, blue = i * 200 % 256;
            sample<uint8_t>(*rgb, c, r, 0) = uint8_t(red);
            sample<uint8_t>(*rgb, c, r, 1) = uint8_t(green);
            sample<uint8_t>(*rgb, c, r, 2) = uint8_t(blue);
            ++occurrences[{red, green, blue}];
            if (red == 0) ++zeroRedPixels;
        }
    int cacheable = 0;
    for (const auto& [colour, count] : occurrences)
        if (std::get<0>(colour) != 0) ++cacheable;

    Wrapped cmyk(kModeCMYK, 1, 4, width, height);
    rgb->convertTo(cmyk.get());
    EXPECT_EQ(host.conversion.hostCalls, cacheable + zeroRedPixels);

    for (int r = 0; r < height; ++r)
        for (int c = 0; c < width; ++c) {
            int16_t expected[4] = {sample<uint8_t>(*rgb, c, r, 0), sample<uint8_t>(*rgb, c, r, 1),
                                   sample<uint8_t>(*rgb, c, r, 2), 0};
            fakeHostConvert(expected);
            for (int k = 0; k < 4; ++k)
                ASSERT_EQ(sample<uint8_t>(*cmyk, c, r, k), expected[k]) << c << "," << r << " channel " << k;
        }

    // A second pass finds every cacheable colour in the table.
    const int before = host.conversion.hostCalls;
    rgb->convertTo(cmyk.get());
    EXPECT_EQ(host.conversion.hostCalls - before, zeroRedPixels);
}

TEST_F(ColorTableTest, ColoursStartingWithZeroAlwaysGoToTheHost) {
    int16_t components[4] = {};
    cStandardColorTable table(kModeRGB, kModeCMYK, components);
    // On an empty table the all-zero colour would match a free entry and answer an all-zero result.
    for (auto [r, g, b] : {std::tuple{0, 0, 0}, std::tuple{0, 7, 9}}) {
        for (int round = 0; round < 3; ++round) {
            setColor(components, r, g, b);
            EXPECT_FALSE(table.lookup()) << "round " << round;
            fakeHostConvert(components);
            table.store();
        }
    }
    EXPECT_EQ(table.fillCount, 0);
    // A zero in a later key byte is an ordinary colour.
    setColor(components, 3, 0, 0);
    EXPECT_FALSE(table.lookup());
    fakeHostConvert(components);
    table.store();
    setColor(components, 3, 0, 0);
    EXPECT_TRUE(table.lookup());
    EXPECT_EQ(components[0], 252);
    EXPECT_EQ(components[3], 126);
}

TEST_F(ColorTableTest, TablePastItsFillLimitIsWipedByTheFirstColourWithoutASlot) {
    int16_t components[4] = {};
    cStandardColorTable table(kModeRGB, kModeCMYK, components);
    ASSERT_EQ(table.fillLimit, 119832);

    int32_t storedBeforeWipe = -1;
    int stores = 0;
    // Distinct colours in a fixed order, red never 0.
    for (uint32_t i = 0; i < 255u * 65536u && storedBeforeWipe < 0; ++i) {
        const int r = 1 + int(i % 255), g = int(i / 255) % 256, b = int(i / 255 / 256);
        setColor(components, r, g, b);
        ASSERT_FALSE(table.lookup()) << "colour " << i << " was never stored";
        fakeHostConvert(components);
        const int32_t before = table.fillCount;
        table.store();
        ++stores;
        if (table.fillCount == before + 1) continue;
        if (table.fillCount == 0) {
            storedBeforeWipe = before;
        } else {
            ASSERT_EQ(table.fillCount, before) << "store changed the count by neither 0, 1 nor a wipe";
            ASSERT_LE(before, table.fillLimit) << "a full probe sequence past the limit must wipe";
        }
    }
    ASSERT_GT(storedBeforeWipe, table.fillLimit) << "wiped before the fill limit";
    EXPECT_LT(stores, 255 * 65536);
    // The first colour stored is gone.
    setColor(components, 1, 0, 0);
    EXPECT_FALSE(table.lookup());
    for (uint32_t e = 0; e < table.capacity * uint32_t(table.entrySize); ++e) ASSERT_EQ(table.entries[e], 0);
}

TEST_F(ColorTableTest, RefusedMemoryGivesASmallerPrimeTable) {
    host.failAllocationsAbove = 100000;
    int16_t components[4] = {};
    cStandardColorTable table(kModeRGB, kModeCMYK, components);
    ASSERT_TRUE(table.usable());
    EXPECT_TRUE(isPrime(table.capacity));
    EXPECT_LE(table.capacity * 7, 100000u);
    for (uint32_t n = table.capacity + 1; n * 7 <= 100000u; ++n) EXPECT_FALSE(isPrime(n)) << n << " would have fit";
    EXPECT_EQ(table.fillLimit, 119832) << "the fill limit stays that of the first capacity";
    setColor(components, 9, 8, 7);
    EXPECT_FALSE(table.lookup());
    fakeHostConvert(components);
    table.store();
    setColor(components, 9, 8, 7);
    EXPECT_TRUE(table.lookup());
}

TEST_F(ColorTableTest, TableWithoutAnyMemoryBehavesAsADummy) {
    host.failAllocationsAbove = 1;  // refuses even capacity 1
    makeFactory();
    Wrapped rgb(kModeRGB, 1, 3, 4, 1, 0, 0, 0, 1, 0x40);
    Wrapped cmyk(kModeCMYK, 1, 4, 4, 1);
    rgb->convertTo(cmyk.get());
    rgb->convertTo(cmyk.get());
    EXPECT_EQ(host.conversion.hostCalls, 8) << "every pixel goes to the host";
    auto* table = dynamic_cast<cStandardColorTable*>(host.conversion.table);
    ASSERT_NE(table, nullptr);
    EXPECT_FALSE(table->usable());
    EXPECT_EQ(sample<uint8_t>(*cmyk, 3, 0, 0), 255 - 0x40);
}

TEST_F(ColorTableTest, FailedTableConstructionLeavesNoSlotBehind) {
    auto& f = makeFactory();
    int16_t components[4] = {};
    host.failLocks = true;
    EXPECT_THROW(f.getTable(kModeRGB, kModeCMYK, components), cMEMException);
    EXPECT_EQ(cColorTableFactory::sharedTableCount(), 0u);
    EXPECT_EQ(host.liveBuffers(), 0u);
    host.failLocks = false;
    EXPECT_NE(f.getTable(kModeRGB, kModeCMYK, components), nullptr);
}

}  // namespace

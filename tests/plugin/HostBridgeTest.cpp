// The kernel's host over a FilterRecord, and the memory handle's lock rules.
#include <gtest/gtest.h>

#include "kernel/ColorTable.h"
#include "kernel/Memory/MEM.h"
#include "plugin/PhotoshopPluginHost.h"
#include "plugin/PluginState.h"
#include "support/MallocHost.h"

namespace {

TEST(MemoryHandle, LockRules) {
    testsupport::MallocHost host;
    KERNEL::cMEM mem(64);
    EXPECT_FALSE(mem.IsLocked());
    void* first = mem.Lock();
    EXPECT_NE(first, nullptr);
    EXPECT_TRUE(mem.IsLocked());
    EXPECT_EQ(mem.Lock(), nullptr) << "a second lock is refused";
    EXPECT_TRUE(mem.IsLocked());
    mem.Unlock();
    EXPECT_FALSE(mem.IsLocked());
    EXPECT_EQ(host.liveBuffers(), 1u);
}

TEST(MemoryHandle, EmptyBufferWithoutAddressLocksWithoutThrowing) {
    testsupport::MallocHost host;
    KERNEL::cMEM mem(0);
    host.failLocks = true;
    EXPECT_EQ(mem.Lock(), nullptr);
}

TEST(MemoryHandle, RefusedAllocationAndLockThrow) {
    testsupport::MallocHost host;
    host.failAllocationAt = 1;
    try {
        KERNEL::cMEM mem(16);
        FAIL() << "allocation should have been refused";
    } catch (const KERNEL::cMEMException& e) {
        EXPECT_STREQ(e.what(), "could not allocate mem handle");
        EXPECT_EQ(e.line(), 18);
    }
    KERNEL::cMEM mem(16);
    host.failLocks = true;
    EXPECT_THROW(mem.Lock(), KERNEL::cMEMException);
    EXPECT_TRUE(mem.IsLocked()) << "a failed lock still counts as locked";
    host.failLocks = false;
}

class RecordTest : public ::testing::Test {
protected:
    void SetUp() override {
        record.imageHRes = 72 << 16;
        record.imageVRes = 300 << 16;
        record.imageMode = 3;
        record.filterRect = {10, 20, 110, 220};
        record.imageSize = {400, 300};
        record.colorServices = &RecordTest::colorServices;
        plugin::gFilterRecord = &record;
        KERNEL::initModeTables();
    }
    void TearDown() override { plugin::gFilterRecord = nullptr; }

    static pi::OSErr colorServices(pi::ColorServicesInfo* info) {
        ++calls;
        lastSource = info->sourceSpace;
        lastResult = info->resultSpace;
        return pi::noErr;
    }
    static inline int calls = 0;
    static inline int lastSource = -9, lastResult = -9;
    pi::FilterRecord record{};
};

TEST_F(RecordTest, GeometryAndResolution) {
    cPhotoshopPluginHost host;
    float h = 0, v = 0;
    host.GetResolution(h, v);
    EXPECT_FLOAT_EQ(h, 72.0f);
    EXPECT_FLOAT_EQ(v, 300.0f);
    KERNEL::cRect r;
    host.GetFilterRect(r);
    EXPECT_EQ(r, (KERNEL::cRect{20, 220, 10, 110}));
    int32_t w = 0, hh = 0;
    host.GetImageSize(w, hh);
    EXPECT_EQ(w, 300);
    EXPECT_EQ(hh, 400);
    EXPECT_EQ(host.GetImageMode(), 3);
}

TEST_F(RecordTest, OneConversionObjectIsPreparedAgainForEachModePair) {
    testsupport::MallocHost memory;  // tables take their storage from the kernel's memory host
    KERNEL::cColorTableFactory factory;
    cPhotoshopPluginHost host;
    host.SetColorTableFactory(&factory);
    KERNEL::cColorConversion* first = host.GetColorConversion(3, 9);
    KERNEL::cColorConversion* second = host.GetColorConversion(3, 4);
    EXPECT_EQ(first, second);
    calls = 0;
    int16_t* c = second->GetComponents();
    c[0] = 10, c[1] = 20, c[2] = 30;
    second->Convert();
    EXPECT_EQ(calls, 1);
    EXPECT_EQ(lastSource, 0) << "RGB";
    EXPECT_EQ(lastResult, 2) << "CMYK";
    c[0] = 10, c[1] = 20, c[2] = 30;
    second->Convert();
    EXPECT_EQ(calls, 1) << "the second request for the same colour is answered by the table";
}

}  // namespace

// The module's lifecycle seen from the entry point, with a bare host of handles and buffers.
#include <dlfcn.h>
#include <gtest/gtest.h>

#include <cstdlib>
#include <cstring>
#include <map>
#include <vector>

#include "hostapi/HostInterface.h"

namespace {

// Handles and buffers that count what is alive.
struct BareHost {
    static inline std::map<pi::Handle, std::vector<char>> handles;
    static inline std::map<pi::BufferID, std::vector<char>> buffers;

    static pi::Handle newHandle(pi::int32 size) {
        auto* master = new char*;
        auto& storage = handles[master];
        storage.assign(size_t(size), '\0');
        *master = storage.data();
        return master;
    }
    static void disposeHandle(pi::Handle h) {
        if (h == nullptr) return;
        handles.erase(h);
        delete h;
    }
    static pi::int32 handleSize(pi::Handle h) { return pi::int32(handles.at(h).size()); }
    static pi::Ptr lockHandle(pi::Handle h, pi::Boolean) { return *h; }
    static void unlockHandle(pi::Handle) {}
    static pi::OSErr allocateBuffer(pi::int32 size, pi::BufferID* id) {
        auto key = reinterpret_cast<pi::BufferID>(new char);
        buffers[key].assign(size_t(size), '\0');
        *id = key;
        return pi::noErr;
    }
    static pi::Ptr lockBuffer(pi::BufferID id, pi::Boolean) { return buffers.at(id).data(); }
    static void unlockBuffer(pi::BufferID) {}
    static void freeBuffer(pi::BufferID id) {
        buffers.erase(id);
        delete reinterpret_cast<char*>(id);
    }
    static pi::OSErr advance() { return pi::noErr; }
};

class Lifecycle : public ::testing::Test {
protected:
    void SetUp() override {
        library = dlopen(NOCTIVA_MODULE_PATH, RTLD_NOW | RTLD_LOCAL);
        ASSERT_NE(library, nullptr) << dlerror();
        entry = reinterpret_cast<PluginEntryProc>(dlsym(library, "ENTRYPOINT"));
        ASSERT_NE(entry, nullptr);
        handleProcs = {pi::kCurrentHandleProcsVersion, pi::kCurrentHandleProcsCount, &BareHost::newHandle,
                       &BareHost::disposeHandle, &BareHost::handleSize, nullptr, &BareHost::lockHandle,
                       &BareHost::unlockHandle, nullptr, nullptr};
        bufferProcs = {pi::kCurrentBufferProcsVersion, pi::kCurrentBufferProcsCount, &BareHost::allocateBuffer,
                       &BareHost::lockBuffer, &BareHost::unlockBuffer, &BareHost::freeBuffer, nullptr,
                       nullptr, nullptr, nullptr};
        record.handleProcs = &handleProcs;
        record.bufferProcs = &bufferProcs;
        record.advanceState = &BareHost::advance;
        record.imageMode = pi::plugInModeRGBColor;
        record.planes = 3;
        record.depth = 8;
        record.imageSize = {20, 30};
        record.filterRect = {0, 0, 20, 30};
        record.imageHRes = record.imageVRes = 72 << 16;
        pixels.assign(size_t(30) * 20 * 3, 100);
        out = pixels;
    }
    void TearDown() override {
        EXPECT_TRUE(BareHost::handles.empty()) << "handles left: " << BareHost::handles.size();
        EXPECT_TRUE(BareHost::buffers.empty()) << "buffers left: " << BareHost::buffers.size();
        if (library) dlclose(library);
    }

    pi::int16 call(pi::int16 selector) {
        result = pi::noErr;
        entry(selector, &record, &data, &result);
        return result;
    }
    // Serves whatever rectangle the module requested from an image of constant rows.
    void serve() {
        record.inData = pixels.data();
        record.outData = out.data();
        record.inRowBytes = record.outRowBytes = 30 * 3;
        // The buffers stand for the requested rectangle's origin.
        const size_t offset = size_t(record.inRect.top) * 90 + size_t(record.inRect.left) * 3;
        record.inData = pixels.data() + offset;
        record.outData = out.data() + offset;
    }
    bool empty(const pi::Rect16& r) { return r.top >= r.bottom || r.left >= r.right; }

    void* library = nullptr;
    PluginEntryProc entry = nullptr;
    pi::HandleProcs handleProcs{};
    pi::BufferProcs bufferProcs{};
    pi::FilterRecord record{};
    std::vector<uint8_t> pixels, out;
    intptr_t data = 0;
    pi::int16 result = 0;
};

TEST_F(Lifecycle, AboutTouchesNeitherCellAndCreatesNothing) {
    data = 12345;
    pi::int16 untouched = 777;
    pi::AboutRecord about{};
    entry(pi::filterSelectorAbout, reinterpret_cast<pi::FilterRecord*>(&about), &data, &untouched);
    EXPECT_EQ(data, 12345);
    EXPECT_EQ(untouched, 777);
    EXPECT_TRUE(BareHost::handles.empty());
    data = 0;
}

TEST_F(Lifecycle, TheObjectLivesInAHandleBetweenCalls) {
    ASSERT_EQ(call(pi::filterSelectorPrepare), pi::noErr);
    ASSERT_NE(data, 0);
    EXPECT_EQ(BareHost::handles.count(reinterpret_cast<pi::Handle>(data)), 1u);
    ASSERT_EQ(call(pi::filterSelectorStart), pi::noErr);
    EXPECT_EQ(record.inRect.bottom, 20);
    EXPECT_EQ(record.inRect.right, 30);
    EXPECT_EQ(record.inputPadding, 255);
    serve();
    ASSERT_EQ(call(pi::filterSelectorContinue), pi::noErr);
    EXPECT_TRUE(empty(record.inRect) && empty(record.outRect) && empty(record.maskRect));
    call(pi::filterSelectorFinish);
    EXPECT_EQ(data, 0);
}

TEST_F(Lifecycle, WithoutAHandleSuiteTheEntryReportsOutOfMemory) {
    record.handleProcs = nullptr;
    EXPECT_EQ(call(pi::filterSelectorPrepare), pi::memFullErr);
    EXPECT_EQ(data, 0);
}

}  // namespace

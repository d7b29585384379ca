// Shared fixture and helpers for the pixel-block tests: blocks over test-owned memory, typed sample
// access, and a leak check against the test host at the end of every test.
#pragma once

#include <gtest/gtest.h>

#include <cstring>
#include <functional>
#include <typeinfo>
#include <memory>
#include <vector>

#include "kernel/Memory/MEM.h"
#include "kernel/PixelBlock.h"
#include "kernel/Types.h"
#include "support/MallocHost.h"

namespace blocktest {

using BlockPtr = std::unique_ptr<KERNEL::cPixelBlock>;

// A block over a vector the test owns; rowBytes 0 means tightly packed.
struct Wrapped {
    std::vector<uint8_t> memory;
    BlockPtr block;

    Wrapped(uint16_t mode, uint32_t bytesPerSample, uint32_t bytesPerPixel, int32_t width, int32_t height,
            uint32_t rowBytes = 0, int32_t x = 0, int32_t y = 0, int32_t sampling = 1, uint8_t fillByte = 0) {
        const int32_t columns = width / sampling, rows = height / sampling;
        if (rowBytes == 0) rowBytes = uint32_t(columns) * bytesPerPixel;
        memory.assign(size_t(rows) * rowBytes, fillByte);
        block.reset(KERNEL::cPixelBlock::create(memory.data(), width, height, bytesPerSample, bytesPerPixel, 0,
                                                sampling, mode, rowBytes, x, y));
    }
    KERNEL::cPixelBlock* operator->() const { return block.get(); }
    KERNEL::cPixelBlock* get() const { return block.get(); }
    KERNEL::cPixelBlock& operator*() const { return *block; }
};

// Channel k of stored pixel (column, row), as the sample type T.
template <class T>
T& sample(const KERNEL::cPixelBlock& b, int32_t column, int32_t row, int32_t k) {
    return *reinterpret_cast<T*>(b.data + size_t(row) * b.rowBytes + size_t(column) * b.bytesPerPixel +
                                 size_t(k) * b.bytesPerSample);
}

class KernelTest : public ::testing::Test {
protected:
    void SetUp() override { KERNEL::initModeTables(); }
    void TearDown() override { EXPECT_EQ(host.liveBuffers(), 0u) << "host buffers leaked"; }

    testsupport::MallocHost host;
};

}  // namespace blocktest

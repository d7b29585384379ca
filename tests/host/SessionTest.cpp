// The session's protocol work, driven by scripted entry points: what a module is served, what
// comes back, and how failures end a run.
#include <gtest/gtest.h>

#include <cstring>
#include <vector>

#include "TestSupport.h"
#include "noctiva/host/Session.h"

using namespace noctiva::host;
using hosttest::script;
using hosttest::scriptedEntry;

namespace {

struct Calls {
    std::vector<pi::int16> selectors;
    int count(pi::int16 s) const { return int(std::count(selectors.begin(), selectors.end(), s)); }
};

pi::Rect16 rect(int top, int left, int bottom, int right) {
    return {pi::int16(top), pi::int16(left), pi::int16(bottom), pi::int16(right)};
}

// Requests `area` with all planes in Start, hands the filled record to `onTile` in Continue, then stops.
RunResult serveOnce(Image& image, pi::Rect16 in, pi::Rect16 out, int inPad, int outPad,
                    const std::function<void(pi::FilterRecord*)>& onTile, Calls* calls = nullptr,
                    RunOptions options = {}) {
    script() = [&](pi::int16 sel, pi::FilterRecord* r, intptr_t*, pi::int16*) {
        if (calls) calls->selectors.push_back(sel);
        if (sel == pi::filterSelectorStart) {
            r->inRect = in;
            r->outRect = out;
            r->inLoPlane = r->outLoPlane = 0;
            r->inHiPlane = r->outHiPlane = pi::int16(r->planes - 1);
            r->inputPadding = pi::int16(inPad);
            r->outputPadding = pi::int16(outPad);
        } else if (sel == pi::filterSelectorContinue) {
            onTile(r);
            r->inRect = r->outRect = rect(0, 0, 0, 0);
        }
    };
    return runFilter(scriptedEntry, image, options);
}

std::uint16_t sampleAt(const pi::FilterRecord* r, bool input, int x, int y, int p, int depth) {
    // Fields of the packed record are read by value: a reference to them may be misaligned.
    const void* data = r->outData;
    pi::Rect16 area = r->outRect;
    if (input) data = r->inData, area = r->inRect;
    const auto* base = static_cast<const unsigned char*>(data);
    const int rowBytes = input ? r->inRowBytes : r->outRowBytes;
    const int column = input ? r->inColumnBytes : r->outColumnBytes;
    const unsigned char* at = base + (y - area.top) * rowBytes + (x - area.left) * column + p * (depth / 8);
    if (depth == 8) return *at;
    std::uint16_t v;
    std::memcpy(&v, at, 2);
    return v;
}

struct PaddingCase {
    int depth;
    int padding;
};

class Padding : public ::testing::TestWithParam<PaddingCase> {};

TEST_P(Padding, AreaBeyondTheImageIsFilledAsAsked) {
    const auto [depth, padding] = GetParam();
    Image image = hosttest::patternImage(5, 4, 3, depth);
    const Image original = image;
    const pi::Rect16 area = rect(-2, -3, 6, 7);  // two rows above, three columns left, beyond both ends
    bool checked = false;
    const RunResult result = serveOnce(image, area, rect(0, 0, 0, 0), padding, -3, [&](pi::FilterRecord* r) {
        ASSERT_TRUE(r->inData != nullptr);
        EXPECT_TRUE(r->outData == nullptr);
        EXPECT_EQ(r->inPlaneBytes, depth / 8);
        EXPECT_EQ(r->inColumnBytes, 3 * depth / 8);
        EXPECT_EQ(r->inRowBytes % 16, 0);
        EXPECT_GT(r->inRowBytes, 10 * r->inColumnBytes) << "rows carry padding past the pixels";
        // A 16-bit constant is the code scaled to the host's 0..32768, rounded: 255 -> 32768, 7 -> 900.
        const std::uint16_t constant = depth == 8 ? std::uint16_t(padding) : padding == 255 ? 32768 : 900;
        for (int y = -2; y < 6; ++y)
            for (int x = -3; x < 7; ++x)
                for (int p = 0; p < 3; ++p) {
                    const bool inside = x >= 0 && x < 5 && y >= 0 && y < 4;
                    std::uint16_t expected;
                    if (inside || padding == -1)
                        expected = original.at(std::clamp(x, 0, 4), std::clamp(y, 0, 3), p);
                    else
                        expected = padding == -2 ? 0 : constant;
                    ASSERT_EQ(sampleAt(r, true, x, y, p, depth), expected) << x << "," << y << " plane " << p;
                }
        checked = true;
    });
    EXPECT_TRUE(result.ok()) << result.message();
    EXPECT_TRUE(checked);
    EXPECT_EQ(image, original);
}

INSTANTIATE_TEST_SUITE_P(Host, Padding,
                         ::testing::Values(PaddingCase{8, 255}, PaddingCase{8, 7}, PaddingCase{8, 0}, PaddingCase{8, -1},
                                           PaddingCase{8, -2}, PaddingCase{16, 255}, PaddingCase{16, 7},
                                           PaddingCase{16, -1}, PaddingCase{16, -2}));

TEST(Session, OutputStartsAsTheDestinationAndOnlyRequestedPlanesGoBack) {
    Image image = hosttest::patternImage(6, 5, 4, 8);
    const Image original = image;
    script() = [&](pi::int16 sel, pi::FilterRecord* r, intptr_t*, pi::int16*) {
        if (sel == pi::filterSelectorStart) {
            r->inRect = rect(0, 0, 0, 0);
            r->outRect = rect(1, 2, 4, 5);
            r->outLoPlane = 1;
            r->outHiPlane = 2;
            r->outputPadding = -3;
        } else if (sel == pi::filterSelectorContinue) {
            EXPECT_EQ(r->outColumnBytes, 2);
            for (int y = 1; y < 4; ++y)
                for (int x = 2; x < 5; ++x) {
                    auto* px = static_cast<unsigned char*>(r->outData) + (y - 1) * r->outRowBytes + (x - 2) * 2;
                    EXPECT_EQ(px[0], original.at(x, y, 1));
                    EXPECT_EQ(px[1], original.at(x, y, 2));
                    px[0] = px[1] = 0;
                }
            r->outRect = rect(0, 0, 0, 0);
        }
    };
    ASSERT_TRUE(runFilter(scriptedEntry, image).ok());
    for (int y = 0; y < 5; ++y)
        for (int x = 0; x < 6; ++x)
            for (int p = 0; p < 4; ++p) {
                const bool written = y >= 1 && y < 4 && x >= 2 && x < 5 && (p == 1 || p == 2);
                EXPECT_EQ(image.at(x, y, p), written ? 0 : original.at(x, y, p)) << x << "," << y << "," << p;
            }
}

TEST(Session, NothingOutsideTheSelectionChanges) {
    Image image = hosttest::patternImage(9, 7, 3, 16);
    const Image original = image;
    RunOptions options;
    options.selection = Selection{2, 1, 4, 3};
    script() = [&](pi::int16 sel, pi::FilterRecord* r, intptr_t*, pi::int16*) {
        if (sel == pi::filterSelectorStart) {
            EXPECT_EQ(r->filterCase, 2);
            EXPECT_EQ(r->filterRect.left, 2);
            EXPECT_EQ(r->filterRect.top, 1);
            EXPECT_EQ(r->filterRect.right, 6);
            EXPECT_EQ(r->filterRect.bottom, 4);
            r->outRect = rect(0, 0, 7, 9);  // greedy: asks for everything
            r->outHiPlane = 2;
        } else if (sel == pi::filterSelectorContinue) {
            for (int y = 0; y < 7; ++y) std::memset(static_cast<char*>(r->outData) + y * r->outRowBytes, 0, 9 * 6);
            r->outRect = rect(0, 0, 0, 0);
        }
    };
    ASSERT_TRUE(runFilter(scriptedEntry, image, options).ok());
    for (int y = 0; y < 7; ++y)
        for (int x = 0; x < 9; ++x) {
            const bool selected = x >= 2 && x < 6 && y >= 1 && y < 4;
            for (int p = 0; p < 3; ++p) EXPECT_EQ(image.at(x, y, p), selected ? 0 : original.at(x, y, p));
        }
}

TEST(Session, RecordDescribesTheImageAndTheHost) {
    Image image = hosttest::patternImage(7, 3, 4, 16);
    RunOptions options;
    options.resolutionDpi = 300;
    script() = [&](pi::int16 sel, pi::FilterRecord* r, intptr_t*, pi::int16*) {
        if (sel != pi::filterSelectorPrepare) return;
        EXPECT_EQ(r->imageMode, pi::plugInModeRGB48);
        EXPECT_EQ(r->depth, 16);
        EXPECT_EQ(r->planes, 4);
        EXPECT_EQ(r->imageSize.h, 7);
        EXPECT_EQ(r->imageSize.v, 3);
        EXPECT_EQ(r->filterCase, 1);
        EXPECT_EQ(r->imageHRes, 300 << 16);
        EXPECT_TRUE(r->supportsPadding);
        EXPECT_FALSE(r->haveMask);
        ASSERT_NE(r->platformData, nullptr);
        EXPECT_EQ(r->platformData->hwnd, 0);
        ASSERT_NE(r->descriptorParameters, nullptr);
        EXPECT_EQ(r->descriptorParameters->descriptor, nullptr) << "no parameters were given";
    };
    const RunResult result = runFilter(scriptedEntry, image, options);
    EXPECT_TRUE(result.ok()) << result.message();
    EXPECT_EQ(result.par1Out, "none");
}

TEST(Session, ResultCodesEndTheRunTheWayHostsDo) {
    struct Case {
        pi::int16 failing;
        bool finishExpected;
    };
    for (const Case c : {Case{pi::filterSelectorPrepare, false}, Case{pi::filterSelectorStart, true},
                         Case{pi::filterSelectorContinue, true}}) {
        Image image = hosttest::patternImage(3, 3, 3, 8);
        const Image original = image;
        Calls calls;
        script() = [&](pi::int16 sel, pi::FilterRecord* r, intptr_t*, pi::int16* result) {
            calls.selectors.push_back(sel);
            if (sel == pi::filterSelectorStart) r->outRect = rect(0, 0, 3, 3), r->outHiPlane = 2;
            if (sel == pi::filterSelectorContinue) {
                // The output tile points into the image: what a failing call wrote must not stay.
                if (r->outData) std::memset(r->outData, 0xAB, 3);
                r->outRect = rect(0, 0, 0, 0);
            }
            if (sel == c.failing) *result = pi::memFullErr;
            if (sel == pi::filterSelectorFinish) *result = pi::paramErr;  // a later error is not the one reported
        };
        const RunResult result = runFilter(scriptedEntry, image);
        EXPECT_EQ(result.result, pi::memFullErr) << c.failing;
        EXPECT_EQ(calls.count(pi::filterSelectorFinish), c.finishExpected ? 1 : 0) << c.failing;
        EXPECT_NE(result.message().find("-108 (out of memory)"), std::string::npos) << result.message();
        EXPECT_EQ(image, original) << c.failing;
    }
}

TEST(Session, AModuleThatNeverFinishesIsStopped) {
    Image image = hosttest::patternImage(3, 3, 3, 8);
    Calls calls;
    RunOptions options;
    options.maxContinueCalls = 25;
    script() = [&](pi::int16 sel, pi::FilterRecord* r, intptr_t*, pi::int16*) {
        calls.selectors.push_back(sel);
        if (sel == pi::filterSelectorStart || sel == pi::filterSelectorContinue) r->maskRect = rect(0, 0, 1, 1);
    };
    const RunResult result = runFilter(scriptedEntry, image, options);
    EXPECT_FALSE(result.ok());
    EXPECT_NE(result.hostError.find("never finished"), std::string::npos);
    EXPECT_EQ(calls.count(pi::filterSelectorContinue), 25);
    EXPECT_EQ(calls.count(pi::filterSelectorFinish), 1);
}

// Refused at Start: no tile is served, and Finish is still called.
TEST(Session, RequestsTheHostCannotServeAreRefused) {
    struct Case {
        const char* what;
        std::function<void(pi::FilterRecord*)> request;
        const char* message;
    };
    const Case cases[] = {
        {"sub-sampled", [](pi::FilterRecord* r) { r->inputRate = 2 << 16; }, "inputRate"},
        {"plane past alpha", [](pi::FilterRecord* r) { r->inHiPlane = 3; }, "planes"},
        {"reversed planes", [](pi::FilterRecord* r) { r->inLoPlane = 2, r->inHiPlane = 1; }, "planes"},
        {"bad padding", [](pi::FilterRecord* r) { r->inputPadding = 256; }, "padding"},
        {"huge area", [](pi::FilterRecord* r) { r->inRect = rect(-32768, -32768, 32767, 32767), r->inputPadding = 0; },
         "too large"},
        {"outside, error on bounds", [](pi::FilterRecord* r) { r->inRect = rect(0, 0, 3, 4), r->inputPadding = -3; },
         "leaves the image"},
    };
    for (const Case& c : cases) {
        Image image = hosttest::patternImage(3, 3, 3, 8);
        Calls calls;
        script() = [&](pi::int16 sel, pi::FilterRecord* r, intptr_t*, pi::int16*) {
            calls.selectors.push_back(sel);
            if (sel != pi::filterSelectorStart) return;
            r->inRect = rect(0, 0, 3, 3);
            r->inHiPlane = 2;
            c.request(r);
        };
        const RunResult result = runFilter(scriptedEntry, image);
        EXPECT_FALSE(result.ok()) << c.what;
        EXPECT_NE(result.hostError.find(c.message), std::string::npos) << c.what << ": " << result.hostError;
        EXPECT_EQ(calls.count(pi::filterSelectorContinue), 0) << c.what;
        EXPECT_EQ(calls.count(pi::filterSelectorFinish), 1) << c.what;
    }
    // Full resolution as modules publish it: 0, the raw 1, or 1.0.
    for (pi::Fixed rate : {0, 1, 1 << 16}) {
        Image image = hosttest::patternImage(3, 3, 3, 8);
        script() = [&](pi::int16 sel, pi::FilterRecord* r, intptr_t*, pi::int16*) {
            if (sel == pi::filterSelectorStart) r->inRect = rect(0, 0, 3, 3), r->inHiPlane = 2, r->inputRate = rate;
            if (sel == pi::filterSelectorContinue) r->inRect = rect(0, 0, 0, 0);
        };
        const RunResult result = runFilter(scriptedEntry, image);
        EXPECT_TRUE(result.ok()) << rate << ": " << result.message();
    }
}

TEST(Session, AdvanceStateServesAndCommitsInsideStart) {
    Image image = hosttest::patternImage(4, 6, 3, 8);
    const Image original = image;
    script() = [&](pi::int16 sel, pi::FilterRecord* r, intptr_t*, pi::int16* result) {
        if (sel != pi::filterSelectorStart) return;
        r->inHiPlane = r->outHiPlane = 2;
        for (int row = 0; row < 6; ++row) {
            r->inRect = r->outRect = rect(row, 0, row + 1, 4);
            if (const pi::OSErr err = r->advanceState(); err != 0) {
                *result = err;
                return;
            }
            for (int i = 0; i < 12; ++i)
                static_cast<unsigned char*>(r->outData)[i] =
                    static_cast<unsigned char>(255 - static_cast<const unsigned char*>(r->inData)[i]);
        }
        r->inRect = r->outRect = rect(0, 0, 0, 0);
    };
    const RunResult result = runFilter(scriptedEntry, image);
    ASSERT_TRUE(result.ok()) << result.message();
    EXPECT_EQ(result.advanceStateCalls, 6);
    EXPECT_EQ(result.continueCalls, 0);
    for (std::size_t i = 0; i < image.sampleCount(); ++i) EXPECT_EQ(image.sample(i), 255 - original.sample(i));
}

TEST(Session, ProgressIsRecordedAndForwarded) {
    Image image = hosttest::patternImage(2, 2, 3, 8);
    std::vector<std::pair<int, int>> seen;
    RunOptions options;
    options.onProgress = [&](std::int32_t d, std::int32_t t) { seen.emplace_back(d, t); };
    script() = [&](pi::int16 sel, pi::FilterRecord* r, intptr_t*, pi::int16*) {
        if (sel == pi::filterSelectorStart) r->progressProc(1, 100), r->progressProc(100, 100);
    };
    const RunResult result = runFilter(scriptedEntry, image, options);
    const std::vector<std::pair<std::int32_t, std::int32_t>> expected = {{1, 100}, {100, 100}};
    EXPECT_EQ(result.progress, expected);
    EXPECT_EQ(seen.size(), 2u);
}

TEST(Session, ReportStringBecomesTheMessage) {
    Image image = hosttest::patternImage(2, 2, 3, 8);
    script() = [&](pi::int16 sel, pi::FilterRecord* r, intptr_t*, pi::int16* result) {
        if (sel != pi::filterSelectorStart) return;
        const char text[] = "tile too small";
        (*r->errorString)[0] = sizeof text - 1;
        std::memcpy(&(*r->errorString)[1], text, sizeof text - 1);
        *result = pi::errReportString;
    };
    const RunResult result = runFilter(scriptedEntry, image);
    EXPECT_EQ(result.result, pi::errReportString);
    EXPECT_NE(result.message().find("tile too small"), std::string::npos) << result.message();
}

TEST(Session, AboutGetsNoFilterRecordState) {
    pi::int16 seenSelector = -1;
    void* platform = nullptr;
    script() = [&](pi::int16 sel, pi::FilterRecord* r, intptr_t* data, pi::int16*) {
        seenSelector = sel;
        std::memcpy(&platform, r, sizeof platform);  // the about record starts with platformData
        EXPECT_EQ(*data, 0);
    };
    EXPECT_EQ(Session::about(scriptedEntry), 0);
    EXPECT_EQ(seenSelector, pi::filterSelectorAbout);
    EXPECT_NE(platform, nullptr);
}

// The memory suites, exercised from inside a run as a module would.
TEST(Session, HandlesKeepContentAcrossResizeAndRelocation) {
    Image image = hosttest::patternImage(2, 2, 3, 8);
    RunOptions options;
    options.relocateHandles = true;
    pi::Handle h = nullptr;
    char* before = nullptr;
    script() = [&](pi::int16 sel, pi::FilterRecord* r, intptr_t*, pi::int16*) {
        pi::HandleProcs* hp = r->handleProcs;
        if (sel == pi::filterSelectorPrepare) {
            h = hp->newProc(8);
            ASSERT_NE(h, nullptr);
            std::memcpy(hp->lockProc(h, 1), "abcdefg", 8);
            before = *h;
            hp->unlockProc(h);
        } else if (sel == pi::filterSelectorStart) {
            char* now = hp->lockProc(h, 1);
            EXPECT_NE(now, before) << "an unlocked handle moves between calls";
            EXPECT_STREQ(now, "abcdefg");
            EXPECT_EQ(static_cast<unsigned char>(before[0]), 0xDD) << "the old storage is poisoned";
            EXPECT_EQ(hp->setSizeProc(h, 4096), 0);
            EXPECT_EQ(hp->getSizeProc(h), 4096);
            EXPECT_STREQ(*h, "abcdefg");
            before = *h;  // locked now: must stay
        } else if (sel == pi::filterSelectorFinish) {
            EXPECT_EQ(*h, before) << "a locked handle never moves";
            hp->unlockProc(h);
            hp->disposeProc(h);
        }
    };
    const RunResult result = runFilter(scriptedEntry, image, options);
    EXPECT_TRUE(result.ok()) << result.message();
    EXPECT_GT(result.handleMoves, 0);
    EXPECT_FALSE(result.leaks.any()) << result.leaks.describe();
}

TEST(Session, BufferSwitchesProvokeFailures) {
    struct Case {
        const char* what;
        std::optional<std::size_t> cap;
        int failAllocation, failLock;
        std::vector<int> sizes;
        std::vector<pi::OSErr> expectedAllocations;
        std::vector<bool> expectedLocks;
    };
    const Case cases[] = {
        {"cap 0", 0, 0, 0, {1}, {pi::memFullErr}, {false}},
        {"cap reached by the second", 150, 0, 0, {100, 100, 50}, {0, pi::memFullErr, 0}, {true, false, true}},
        {"second allocation fails", std::nullopt, 2, 0, {10, 10, 10}, {0, pi::memFullErr, 0}, {true, false, true}},
        {"second lock fails", std::nullopt, 0, 2, {10, 10, 10}, {0, 0, 0}, {true, false, true}},
        {"empty buffer", std::nullopt, 0, 0, {0}, {0}, {true}},
    };
    for (const Case& c : cases) {
        Image image = hosttest::patternImage(2, 2, 3, 8);
        RunOptions options;
        options.bufferCap = c.cap;
        options.failBufferAllocation = c.failAllocation;
        options.failBufferLock = c.failLock;
        options.failOnLeak = true;
        script() = [&](pi::int16 sel, pi::FilterRecord* r, intptr_t*, pi::int16*) {
            if (sel != pi::filterSelectorStart) return;
            pi::BufferProcs* bp = r->bufferProcs;
            std::vector<pi::BufferID> live;
            for (std::size_t i = 0; i < c.sizes.size(); ++i) {
                pi::BufferID id = nullptr;
                EXPECT_EQ(bp->allocateProc(c.sizes[i], &id), c.expectedAllocations[i]) << c.what << " #" << i;
                char* p = id ? bp->lockProc(id, 1) : nullptr;
                EXPECT_EQ(p != nullptr, c.expectedLocks[i]) << c.what << " #" << i;
                if (p) bp->unlockProc(id);
                if (id) live.push_back(id);
            }
            for (pi::BufferID id : live) bp->freeProc(id);
        };
        const RunResult result = runFilter(scriptedEntry, image, options);
        EXPECT_TRUE(result.ok()) << c.what << ": " << result.message();
    }
}

TEST(Session, LeftoverHandlesAndBuffersAreLeaks) {
    for (const bool failOnLeak : {false, true}) {
        Image image = hosttest::patternImage(2, 2, 3, 8);
        RunOptions options;
        options.failOnLeak = failOnLeak;
        script() = [&](pi::int16 sel, pi::FilterRecord* r, intptr_t*, pi::int16*) {
            // The parameter block passes to the host: no leak.
            if (sel == pi::filterSelectorFinish) r->parameters = r->handleProcs->newProc(64);
            if (sel != pi::filterSelectorStart) return;
            r->handleProcs->newProc(40);
            pi::BufferID id = nullptr;
            r->bufferProcs->allocateProc(1000, &id);
            r->descriptorParameters->writeDescriptorProcs->openWriteDescriptorProc();
        };
        const RunResult result = runFilter(scriptedEntry, image, options);
        EXPECT_EQ(result.leaks.handles, 1);
        EXPECT_EQ(result.leaks.handleBytes, 40u);
        EXPECT_EQ(result.leaks.buffers, 1);
        EXPECT_EQ(result.leaks.bufferBytes, 1000u);
        EXPECT_EQ(result.leaks.writeTokens, 1);
        EXPECT_EQ(result.ok(), !failOnLeak);
        if (failOnLeak) {
            EXPECT_NE(result.hostError.find("leaked 1 handle"), std::string::npos) << result.hostError;
        }
    }
}

TEST(Session, DescriptorsCarryPar1AndDRes) {
    struct Case {
        const char* written;
        std::size_t length;
    };
    // The module may record the text with or without its terminator.
    for (const Case c : {Case{"vek  Parameter0 1 ", 19}, Case{"vek  Parameter0 1 ", 18}}) {
        Image image = hosttest::patternImage(2, 2, 3, 8);
        RunOptions options;
        options.par1 = "vek  Parameter0 5 ";
        options.dRes = 3;
        std::string readText;
        pi::int32 readDRes = 0;
        pi::uint32 keys[] = {pi::keyPar1, 0};
        script() = [&](pi::int16 sel, pi::FilterRecord* r, intptr_t*, pi::int16*) {
            pi::PIDescriptorParameters* dp = r->descriptorParameters;
            if (sel == pi::filterSelectorPrepare) {
                pi::PIReadDescriptor t = dp->readDescriptorProcs->openReadDescriptorProc(dp->descriptor, keys);
                ASSERT_NE(t, nullptr);
                pi::uint32 key, type;
                pi::int32 flags;
                while (dp->readDescriptorProcs->getKeyProc(t, &key, &type, &flags)) {
                    if (key == pi::keyPar1) {
                        EXPECT_EQ(type, pi::typeText);
                        pi::int32 wrong = 0;
                        EXPECT_NE(dp->readDescriptorProcs->getIntegerProc(t, &wrong), 0) << "a text is no integer";
                        pi::Handle h = nullptr;
                        ASSERT_EQ(dp->readDescriptorProcs->getTextProc(t, &h), 0);
                        readText.assign(*h, std::size_t(r->handleProcs->getSizeProc(h)));
                        r->handleProcs->disposeProc(h);
                    } else if (key == pi::keyDRes) {
                        EXPECT_EQ(type, pi::typeInteger);
                        dp->readDescriptorProcs->getIntegerProc(t, &readDRes);
                    }
                }
                EXPECT_NE(dp->readDescriptorProcs->closeReadDescriptorProc(t), 0) << "the failed read is sticky";
            } else if (sel == pi::filterSelectorFinish) {
                pi::PIWriteDescriptor w = dp->writeDescriptorProcs->openWriteDescriptorProc();
                pi::Handle h = r->handleProcs->newProc(pi::int32(c.length));
                std::memcpy(*h, c.written, c.length);
                EXPECT_EQ(dp->writeDescriptorProcs->putTextProc(w, pi::keyPar1, h), 0);
                pi::Handle out = nullptr;
                EXPECT_EQ(dp->writeDescriptorProcs->closeWriteDescriptorProc(w, &out), 0);
                dp->descriptor = out;  // neither the text nor the old descriptor is disposed
            }
        };
        const RunResult result = runFilter(scriptedEntry, image, options);
        EXPECT_TRUE(result.ok()) << result.message();
        EXPECT_EQ(readText, "vek  Parameter0 5 ") << "no terminator in the handle";
        EXPECT_EQ(readDRes, 3);
        EXPECT_EQ(keys[0], pi::typeNull) << "a returned key is crossed out";
        EXPECT_EQ(result.par1Out, "vek  Parameter0 1 ");
        EXPECT_FALSE(result.leaks.any()) << result.leaks.describe();
    }
}

TEST(Session, CallbacksOutsideARunFailQuietly) {
    Image image = hosttest::patternImage(2, 2, 3, 8);
    pi::HandleProcs handles{};
    pi::AdvanceStateProc advance = nullptr;
    script() = [&](pi::int16 sel, pi::FilterRecord* r, intptr_t*, pi::int16*) {
        if (sel == pi::filterSelectorPrepare) handles = *r->handleProcs, advance = r->advanceState;
    };
    runFilter(scriptedEntry, image);
    EXPECT_EQ(handles.newProc(10), nullptr);
    EXPECT_NE(advance(), 0);
}

}  // namespace

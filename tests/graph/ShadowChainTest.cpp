// The shadow chain: its parameter text (every field by number, reading rules, bounds), borders, the
// bypassed chain as the Lab round trip, and ownership. The defaults and their order are checked
// through the module (tests/e2e).
#include <gtest/gtest.h>

#include <memory>
#include <string>
#include <vector>

#include "graph/GraphTestSupport.h"
#include "kernel/FilterAction.h"
#include "kernel/Lab.h"
#include "steps/ParameterTable.h"
#include "steps/ShadowChain.h"
#include "steps/Step1.h"
#include "steps/Step2.h"
#include "steps/Step3.h"
#include "steps/Step4.h"
#include "support/MallocHost.h"
#include "support/StepFields.h"

using graphtest::Image;
using KERNEL::cRect;

namespace {

int& stepsAlive() {
    static int n = 0;
    return n;
}
template <class Step>
struct Counted : Step {
    Counted(KERNEL::cHost* host) : Step(nullptr, host, nullptr, nullptr) { ++stepsAlive(); }
    ~Counted() override { --stepsAlive(); }
};

// Steps as the filter object makes them: default fields, step 2 in mode 104.
struct Shadow {
    testsupport::MallocHost host;
    Counted<cStep1>* step1 = new Counted<cStep1>(&host);
    Counted<cStep2>* step2 = new Counted<cStep2>(&host);
    Counted<cStep3>* step3 = new Counted<cStep3>(&host);
    Counted<cStep4>* step4 = new Counted<cStep4>(&host);
    std::unique_ptr<cRGB32FilterAction> action;

    Shadow() {
        step2->mode = 104;
        action.reset(buildShadowAction(step1, step2, step3, step4));
    }
    // Field i of the text, in text order.
    int32_t* field(int i) { return fields()[size_t(i)]; }
    std::vector<int32_t*> fields() {
        std::vector<int32_t*> f;
        const auto add = [&f](std::vector<int32_t*> stepFields, int32_t* mode) {
            f.insert(f.end(), stepFields.begin(), stepFields.end());
            f.push_back(mode);
        };
        add(testsupport::fieldsOf(*step4), &step4->mode);
        add(testsupport::fieldsOf(*step3), &step3->mode);
        add(testsupport::fieldsOf(*step2), &step2->mode);
        add(testsupport::fieldsOf(*step1), &step1->mode);
        return f;
    }
};

TEST(ShadowChain, ReadingBackReproducesEveryField) {
    Shadow a;
    ASSERT_EQ(a.fields().size(), kShadowParameterCount);
    int32_t v = -29;
    for (int32_t* f : a.fields()) {
        v += 1237;
        *f = v * ((v & 1) ? -1 : 1);
    }
    *a.field(0) = INT32_MIN;
    *a.field(1) = INT32_MAX;
    const std::string text = writeShadowParameters(*a.action);

    Shadow b;
    readShadowParameters(*b.action, text.c_str());
    for (int i = 0; i < int(kShadowParameterCount); ++i) EXPECT_EQ(*b.field(i), *a.field(i)) << i;
    EXPECT_EQ(writeShadowParameters(*b.action), text);
    // An empty text changes nothing.
    readShadowParameters(*b.action, "");
    readShadowParameters(*b.action, "   ");
    EXPECT_EQ(writeShadowParameters(*b.action), text);
}

std::string entryText(int n, int32_t value) {
    return " Parameter" + std::to_string(n) + " " + std::to_string(value) + " ";
}

TEST(ShadowChain, MissingEntryKeepsItsFieldAndStillConsumesItsNumber) {
    Shadow s;
    std::string text;
    for (int i = 0; i < int(kShadowParameterCount); ++i) {
        if (i != 12) text += entryText(i, 1000 + i);
    }
    *s.field(12) = -5;
    readShadowParameters(*s.action, text.c_str());
    EXPECT_EQ(*s.field(12), -5);
    for (int i = 0; i < int(kShadowParameterCount); ++i) {
        if (i != 12) {
            EXPECT_EQ(*s.field(i), 1000 + i) << i;
        }
    }
}

TEST(ShadowChain, MissingEntryFiveTakesTheDigitAfterParameter5Of50) {
    // The reading rule is a plain substring search: "Parameter5" first matches inside "Parameter50",
    // the value parsed just after it is the digit 0, and the cursor then stands inside that name, so
    // entries 6 to 50 are not found and keep their values.
    Shadow s;
    std::string text;
    for (int i = 0; i < int(kShadowParameterCount); ++i)
        if (i != 5) text += entryText(i, i == 50 ? 104 : 2000 + i);
    for (int i = 0; i < int(kShadowParameterCount); ++i) *s.field(i) = -1 - i;
    readShadowParameters(*s.action, text.c_str());
    for (int i = 0; i < 5; ++i) EXPECT_EQ(*s.field(i), 2000 + i) << i;
    EXPECT_EQ(*s.field(5), 0);
    for (int i = 6; i <= 50; ++i) EXPECT_EQ(*s.field(i), -1 - i) << i;
    for (int i = 51; i < int(kShadowParameterCount); ++i) EXPECT_EQ(*s.field(i), 2000 + i) << i;
}

TEST(ShadowChain, BoundedWriteNeverPassesTheCapacity) {
    Shadow s;
    for (int32_t* f : s.fields()) *f = -2000000000;  // the longest values
    const std::string full = writeShadowParameters(*s.action);
    ASSERT_LE(full.size(), s.action->ParameterTextLength());
    for (size_t capacity : {size_t(0), size_t(1), size_t(2), size_t(30), size_t(31), size_t(100), full.size(),
                            full.size() + 1, size_t(10096)}) {
        SCOPED_TRACE(capacity);
        std::vector<char> buffer(capacity + 16, '#');
        const size_t length = writeShadowParameters(*s.action, buffer.data(), capacity);
        if (capacity == 0) {
            EXPECT_EQ(length, 0u);
            EXPECT_EQ(buffer[0], '#');
            continue;
        }
        ASSERT_LT(length, capacity);
        EXPECT_EQ(buffer[length], '\0');
        EXPECT_EQ(full.compare(0, length, buffer.data(), length), 0);
        for (size_t i = capacity; i < buffer.size(); ++i) ASSERT_EQ(buffer[i], '#') << i;
        if (capacity > full.size()) {
            EXPECT_EQ(length, full.size());
        }
    }
}

TEST(ShadowChain, BordersPerNodeAndTheWideVariant) {
    for (int32_t mode : {104, 108}) {
        SCOPED_TRACE(mode);
        Shadow s;
        s.step2->mode = mode;
        Image in(20, 20), out(20, 20);
        auto src = in.block();
        auto dst = out.block();
        s.action->Apply(src.get(), dst.get());
        const int32_t wide = mode == 108 ? 10 : 0;
        // From the final node (step 4) to the input node.
        const int32_t expected[] = {0, 0, 0, 20 + wide, 30 + wide, 30 + wide, 30 + wide};
        KERNEL::__cFilterComponent__* node = s.action->Composite().Node();
        for (int32_t e : expected) {
            ASSERT_NE(node, nullptr);
            EXPECT_EQ(node->BorderX(), e);
            EXPECT_EQ(node->BorderY(), e);
            auto* pipe = dynamic_cast<KERNEL::__cPipe__*>(node);
            node = pipe ? pipe->Upstream() : nullptr;
        }
        EXPECT_EQ(node, nullptr);
    }
}

TEST(ShadowChain, AllStepsBypassedIsTheLabRoundTrip) {
    Shadow s;
    s.step2->mode = 0;
    Image in(37, 23, 5, 9), out(37, 23, 5, 9);
    in.fillRandom(21);
    const int32_t white[3] = {65535, 65535, 65535};
    std::copy(white, white + 3, in.at(10, 12));
    std::fill(out.samples.begin(), out.samples.end(), -9);
    const cRect core{8, 40, 11, 30};
    auto src = in.block({5, 42, 9, 32}, core);
    auto dst = out.block();
    s.action->Apply(src.get(), dst.get());
    for (int32_t y = 9; y < 32; ++y)
        for (int32_t x = 5; x < 42; ++x) {
            const bool inCore = x >= core.x0 && x < core.x1 && y >= core.y0 && y < core.y1;
            const int32_t* p = in.at(x, y);
            int32_t L, a, b, e[3];
            KERNEL::lab::toLab(p[0], p[1], p[2], L, a, b);
            KERNEL::lab::toRGB(L, a, b, e[0], e[1], e[2]);
            for (int k = 0; k < 3; ++k) ASSERT_EQ(out.at(x, y)[k], inCore ? e[k] : -9) << x << "," << y << "," << k;
        }
    EXPECT_EQ(out.at(10, 12)[0], 65268);
    EXPECT_EQ(out.at(10, 12)[1], 65301);
    EXPECT_EQ(out.at(10, 12)[2], 65301);
}

TEST(ShadowChain, StepModeFromTheTextActivatesTheStep) {
    Shadow s;
    s.step2->mode = 0;
    Image in(16, 16), out(16, 16);
    auto src = in.block();
    auto dst = out.block();
    s.action->Apply(src.get(), dst.get());
    const size_t cached = s.host.liveBuffers();
    // A complete text: alone, "Parameter57" would be taken by the search for "Parameter5".
    std::string text = writeShadowParameters(*s.action);
    const size_t at = text.rfind(entryText(57, 0));
    ASSERT_NE(at, std::string::npos);
    text.replace(at, std::string::npos, entryText(57, 3));
    readShadowParameters(*s.action, text.c_str());
    EXPECT_EQ(s.step1->mode, 3);
    EXPECT_TRUE(s.action->HasChanged());
    s.action->Apply(src.get(), dst.get());
    EXPECT_GT(s.host.liveBuffers(), cached);  // step 1 now keeps an output of its own
}

TEST(ShadowChain, DeletingTheActionDeletesStepsConvertersAndBuffers) {
    const int before = stepsAlive();
    {
        Shadow s;
        EXPECT_EQ(stepsAlive(), before + 4);
        EXPECT_EQ(s.step2->RefCount(), 1);
        Image in(64, 48), out(64, 48);
        in.fillRandom(2);
        auto src = in.block({0, 64, 0, 48}, {10, 54, 10, 38});
        auto dst = out.block();
        s.action->Apply(src.get(), dst.get());
        s.action.reset();
        EXPECT_EQ(stepsAlive(), before);
        EXPECT_EQ(s.host.liveBuffers(), 0u);
    }
}

}  // namespace

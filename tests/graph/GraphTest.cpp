// The component graph through the kernel API: caching and change detection, borders, bypass, keys
// and sharing, syntax objects, ownership.
#include <gtest/gtest.h>

#include <memory>

#include "graph/GraphTestSupport.h"
#include "kernel/Composite.h"
#include "kernel/FilterAction.h"
#include "kernel/Lab.h"
#include "kernel/Node.h"
#include "kernel/Syntax.h"
#include "support/MallocHost.h"

using graphtest::Image;
using graphtest::TestPipe;
using graphtest::widened;
using KERNEL::cComposite;
using KERNEL::cRect;

namespace {

// source -> p1 -> p2 -> p3 (p3 final), built with the syntax objects.
struct Chain {
    testsupport::MallocHost host;
    Image image{40, 30, 100, 200};
    KERNEL::cPixelBlock* source;
    TestPipe* p1 = new TestPipe(2, 1);
    TestPipe* p2 = new TestPipe(3, 1);
    TestPipe* p3 = new TestPipe(0, 0);
    std::unique_ptr<cComposite> composite = std::make_unique<cComposite>();

    Chain() {
        image.fillRandom(7);
        source = image.block({100, 140, 200, 230}, {110, 130, 210, 220}).release();
        source->AddRef();  // the test's own reference, so the block outlives the chain
        composite->SetNode(p3->Chain(p2)->Append(p1)->Terminate(source));
    }
    ~Chain() {
        composite.reset();
        source->Release();
    }
    KERNEL::__cPipe__* node(int i) {  // 3 = final
        auto* n = static_cast<KERNEL::__cPipe__*>(composite->Node());
        for (int k = 3; k > i; --k) n = static_cast<KERNEL::__cPipe__*>(n->Upstream());
        return n;
    }
};

TEST(Graph, SyntaxBuildsTheChainFromTheSourceUp) {
    Chain c;
    EXPECT_EQ(c.node(3)->Front(), c.p3);
    EXPECT_EQ(c.node(2)->Front(), c.p2);
    EXPECT_EQ(c.node(1)->Front(), c.p1);
    auto* input = dynamic_cast<KERNEL::__cInput__*>(c.node(1)->Upstream());
    ASSERT_NE(input, nullptr);
    EXPECT_EQ(input->Front(), c.source);
    EXPECT_EQ(c.source->RefCount(), 2);

    uint32_t length = 0;
    const uint32_t* key = c.composite->Node()->GetKey(length);
    ASSERT_EQ(length, 4u);
    EXPECT_EQ(key[0], c.p3->Id());
    EXPECT_EQ(key[1], c.p2->Id());
    EXPECT_EQ(key[2], c.p1->Id());
    EXPECT_EQ(key[3], c.source->Id());
    c.composite->Reset();
    EXPECT_EQ(c.p1->resets + c.p2->resets + c.p3->resets, 3);
}

TEST(Graph, BordersAccumulateUpstreamAndAreUndoneAfterProcess) {
    Chain c;
    const cRect inner = c.source->innerRect;
    KERNEL::cPixelBlock* out = c.composite->Evaluate();
    ASSERT_NE(out, nullptr);
    EXPECT_EQ(c.node(3)->BorderX(), 0);
    EXPECT_EQ(c.node(2)->BorderX(), 3);
    EXPECT_EQ(c.node(1)->BorderY(), 5);
    EXPECT_EQ(c.node(1)->Upstream()->BorderX(), 5);
    // Each stage worked on the area widened by its node's border ...
    EXPECT_EQ(c.p1->seenSrcInner, widened(inner, 5, 5));
    EXPECT_EQ(c.p1->seenDstInner, widened(inner, 5, 5));
    EXPECT_EQ(c.p2->seenSrcInner, widened(inner, 3, 3));
    EXPECT_EQ(c.p3->seenSrcInner, inner);
    // ... and every block is back to the tile's rectangle afterwards.
    EXPECT_EQ(out->innerRect, inner);
    EXPECT_EQ(c.node(1)->CachedOutput()->innerRect, inner);
    EXPECT_EQ(c.node(2)->CachedOutput()->innerRect, inner);
    EXPECT_EQ(c.source->innerRect, inner);
}

// Evaluating twice: what the change in between makes each stage compute again.
TEST(Graph, OnlyChangedStagesAndWhatFollowsAreRecomputed) {
    const struct {
        const char* what;
        void (*change)(Chain&);
        int p1, p2, p3;
    } cases[] = {
        {"nothing", [](Chain&) {}, 1, 1, 1},
        {"middle mode", [](Chain& c) { c.p2->mode = 5; }, 1, 2, 2},
        {"final mode", [](Chain& c) { c.p3->mode = 2; }, 1, 1, 2},
        {"inner", [](Chain& c) { c.source->innerRect.x1 -= 1; }, 2, 2, 2},
        {"outer", [](Chain& c) { c.source->outerRect.y1 -= 1; }, 2, 2, 2},
        {"sampling", [](Chain& c) { c.source->sampling = 2; }, 2, 2, 2},
        {"invalidated", [](Chain& c) { c.composite->InvalidateAndFree(); }, 2, 2, 2},
    };
    for (const auto& tc : cases) {
        SCOPED_TRACE(tc.what);
        Chain c;
        KERNEL::cPixelBlock* first = c.composite->Evaluate();
        tc.change(c);
        KERNEL::cPixelBlock* second = c.composite->Evaluate();
        EXPECT_EQ(c.p1->calls, tc.p1);
        EXPECT_EQ(c.p2->calls, tc.p2);
        EXPECT_EQ(c.p3->calls, tc.p3);
        if (tc.p3 == 1) {
            EXPECT_EQ(first, second);
        }
        EXPECT_FALSE(c.composite->HasChanged());
    }
}

TEST(Graph, BypassedStagesHandTheirInputOnAndAreNeverCalled) {
    {
        Chain c;  // each chain installs its own host: one at a time
        c.p2->mode = 0;
        ASSERT_NE(c.composite->Evaluate(), nullptr);
        EXPECT_EQ(c.p2->calls, 0);
        EXPECT_EQ(c.node(2)->CachedOutput(), c.node(1)->CachedOutput());
        EXPECT_EQ(c.p3->seenSrcInner, c.source->innerRect);
    }

    // All bypassed: the source's pixels come out, until a stage is switched on again.
    Chain d;
    d.p1->mode = d.p2->mode = d.p3->mode = 0;
    KERNEL::cPixelBlock* view = d.composite->Evaluate();
    ASSERT_NE(view, nullptr);
    EXPECT_EQ(view->data, d.source->data);
    EXPECT_EQ(d.p1->calls + d.p2->calls + d.p3->calls, 0);
    d.p2->mode = 1;
    d.composite->Evaluate();
    EXPECT_EQ(d.p2->calls, 1);
    EXPECT_EQ(d.p1->calls, 0);
}

TEST(Graph, OwnershipIsLeakFree) {
    const int before = graphtest::liveComponents();
    {
        testsupport::MallocHost host;
        Image image(20, 20);
        auto* source = image.block().release();
        auto composite = std::make_unique<cComposite>();
        composite->SetNode((new TestPipe(1, 1))->Chain(new TestPipe(1, 1))->Append(new TestPipe(0, 0))->Terminate(source));
        EXPECT_EQ(graphtest::liveComponents(), before + 3);
        composite->Evaluate();
        composite->Evaluate();
        EXPECT_GT(host.liveBuffers(), 0u);
        // A new chain replaces the old one: the old nodes and their fronts go.
        auto* source2 = image.block().release();
        composite->SetNode((new TestPipe(0, 0))->Chain(new TestPipe(0, 0))->Terminate(source2));
        EXPECT_EQ(graphtest::liveComponents(), before + 2);
        EXPECT_EQ(host.liveBuffers(), 0u);
        composite->Evaluate();
        composite.reset();
        EXPECT_EQ(graphtest::liveComponents(), before);
        EXPECT_EQ(host.liveBuffers(), 0u);
    }
}

TEST(Graph, ExceptionInProcessRestoresRectanglesAndLeaksNothing) {
    struct Throwing : TestPipe {
        using TestPipe::TestPipe;
        void Process(KERNEL::cPixelBlock*, KERNEL::cPixelBlock*) override { throw std::runtime_error("boom"); }
    };
    testsupport::MallocHost host;
    Image image(20, 20);
    auto* source = image.block({0, 20, 0, 20}, {5, 15, 5, 15}).release();
    source->AddRef();
    {
        cComposite composite;
        composite.SetNode((new Throwing(4))->Chain(new TestPipe(2, 0))->Terminate(source));
        EXPECT_THROW(composite.Evaluate(), std::runtime_error);
        EXPECT_EQ(source->innerRect, (cRect{5, 15, 5, 15}));
        auto* mid = static_cast<KERNEL::__cPipe__*>(static_cast<KERNEL::__cPipe__*>(composite.Node())->Upstream());
        EXPECT_EQ(mid->CachedOutput()->innerRect, (cRect{5, 15, 5, 15}));
    }
    EXPECT_EQ(host.liveBuffers(), 0u);
    source->Release();
}

TEST(Graph, ShareUpstreamTakesAnEqualKeyedNodeWithoutOwningIt) {
    testsupport::MallocHost host;
    Image image(10, 10);
    auto* source = image.block().release();
    auto* a = new TestPipe(0, 0);
    auto* b = new TestPipe(0, 0);
    // Two chains over the same fronts: b <- a <- source, twice.
    auto* chain1 = static_cast<KERNEL::__cPipe__*>(b->Chain(a)->Terminate(source));
    auto* chain2 = static_cast<KERNEL::__cPipe__*>(b->Chain(a)->Terminate(source));
    uint32_t l1 = 0, l2 = 0;
    chain1->BuildKey(l1);
    chain2->BuildKey(l2);
    auto* aNode1 = chain1->Upstream();
    EXPECT_TRUE(chain2->ShareUpstream(aNode1));
    EXPECT_EQ(chain2->Upstream(), aNode1);
    EXPECT_FALSE(chain2->OwnsUpstream());
    // A node never takes itself or its own upstream.
    EXPECT_FALSE(chain1->ShareUpstream(chain1));
    EXPECT_FALSE(chain1->ShareUpstream(aNode1));
    delete chain2;  // does not delete the shared node
    EXPECT_EQ(a->RefCount(), 1);
    delete chain1;
    EXPECT_EQ(host.liveBuffers(), 0u);
}

// ---- Through the filter action: caching across Apply, writing the core. Seams between tiles are
// checked through the module (tests/e2e, Seams).

struct ActionChain {
    std::unique_ptr<cRGB32FilterAction> action = std::make_unique<cRGB32FilterAction>();
    TestPipe* p1;
    TestPipe* p2;
    ActionChain(int32_t k) : p1(new TestPipe(k, k)), p2(new TestPipe(k, k)) {
        p1->offset = 1;  // so that a skipped stage shows
        action->SetNode((new cLAB2RGB)
                            ->Chain(p2)
                            ->Append(p1)
                            ->Append(new cRGB2LAB)
                            ->Terminate(action->GetSourceBlock()));
    }
};

TEST(GraphAction, SameTileTwiceComputesOnceAndANewTileRecomputes) {
    testsupport::MallocHost host;
    ActionChain c(2);
    Image in(60, 60), out(60, 60);
    in.fillRandom(5);
    auto dst = out.block();
    auto a = in.block({0, 60, 0, 60}, {10, 40, 10, 40});
    auto b = in.block({0, 60, 0, 60}, {20, 50, 10, 40});
    c.action->Apply(a.get(), dst.get());
    c.action->Apply(a.get(), dst.get());
    EXPECT_EQ(c.p1->calls, 1);
    EXPECT_EQ(c.p2->calls, 1);
    c.action->Apply(b.get(), dst.get());
    EXPECT_EQ(c.p1->calls, 2);
    // The descriptor block is empty between tiles; the working blocks are gone.
    EXPECT_EQ(c.action->GetSourceBlock()->data, nullptr);
    EXPECT_EQ(c.action->GetSourceBlock()->sampling, 0);
    EXPECT_EQ(c.action->GetSourceBlock()->memory, nullptr);
    c.action->InvalidateAndFree();
    EXPECT_EQ(host.liveBuffers(), 0u);
}

TEST(GraphAction, ApplyWritesOnlyTheCoreAndNothingWhenDisabled) {
    testsupport::MallocHost host;
    ActionChain c(1);
    Image in(30, 30), out(30, 30);
    in.fillRandom(8);
    std::fill(out.samples.begin(), out.samples.end(), -7);
    auto src = in.block({0, 30, 0, 30}, {5, 20, 8, 25});
    auto dst = out.block();
    c.action->Disable();
    c.action->Apply(src.get(), dst.get());
    EXPECT_EQ(c.p1->calls, 0);
    EXPECT_TRUE(std::all_of(out.samples.begin(), out.samples.end(), [](int32_t v) { return v == -7; }));
    c.action->Enable();
    c.action->Apply(src.get(), dst.get());
    for (int32_t y = 0; y < 30; ++y)
        for (int32_t x = 0; x < 30; ++x) {
            const bool core = x >= 5 && x < 20 && y >= 8 && y < 25;
            ASSERT_EQ(out.at(x, y)[0] != -7, core) << x << "," << y;
        }
}

}  // namespace

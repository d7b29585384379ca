// A small filter module for testing the host: it inverts RGB and carries alpha through. It lives in
// a host handle like a real filter and takes its orders from the 'par1' text, key=value words:
//   tile=N margin=M     tile size (0: the whole filter rectangle) and input margin
//   outmargin=1         request the margin in outRect too (writing only the core)
//   inpad=P outpad=P    padding codes
//   advance=1           do all the work inside Start through advanceState
//   buffer=N            allocate, lock and use a scratch buffer of N bytes for every tile
//   fail=C              return C from the first Continue
//   color=1             convert every tile's first pixel RGB -> HSB -> RGB through colour services
// At Finish it records in 'par1': "tiles=T colors=C got=<the par1 it received>".
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <new>

#include "hostapi/HostInterface.h"

namespace {

struct Config {
    int tile = 0, margin = 0;
    bool outMargin = false;
    int inPad = -1, outPad = -1;
    bool advance = false;
    int buffer = 0;
    int fail = 0;
    bool color = false;
};

// Lives in a relocatable handle: no pointers into itself.
struct State {
    Config cfg;
    int tileX = 0, tileY = 0;  // current tile's top-left, relative to the filter rectangle
    long tiles = 0;
    long colors = 0;
    pi::BufferID scratch = nullptr;
    char par1[512] = {};
};

int value(const char* text, const char* key, int fallback) {
    const char* p = std::strstr(text, key);
    return p ? std::atoi(p + std::strlen(key)) : fallback;
}

void parse(State& s) {
    Config& c = s.cfg;
    c.tile = value(s.par1, "tile=", 0);
    c.margin = value(s.par1, "margin=", 0);
    c.outMargin = value(s.par1, "outmargin=", 0) != 0;
    c.inPad = value(s.par1, "inpad=", -1);
    c.outPad = value(s.par1, "outpad=", -1);
    c.advance = value(s.par1, "advance=", 0) != 0;
    c.buffer = value(s.par1, "buffer=", 0);
    c.fail = value(s.par1, "fail=", 0);
    c.color = value(s.par1, "color=", 0) != 0;
}

void readDescriptor(pi::FilterRecord* r, State& s) {
    pi::PIDescriptorParameters* dp = r->descriptorParameters;
    if (!dp || !dp->descriptor) return;
    pi::uint32 keys[] = {pi::keyPar1, 0};
    pi::PIReadDescriptor token = dp->readDescriptorProcs->openReadDescriptorProc(dp->descriptor, keys);
    if (!token) return;
    pi::uint32 key = 0, type = 0;
    pi::int32 flags = 0;
    while (dp->readDescriptorProcs->getKeyProc(token, &key, &type, &flags)) {
        if (key == pi::keyPar1) {
            pi::Handle text = nullptr;
            if (dp->readDescriptorProcs->getTextProc(token, &text) != 0 || !text) continue;
            const pi::int32 size = r->handleProcs->getSizeProc(text);
            const char* p = r->handleProcs->lockProc(text, 1);
            const std::size_t n = std::size_t(size) < sizeof s.par1 - 1 ? std::size_t(size) : sizeof s.par1 - 1;
            std::memcpy(s.par1, p, n);
            s.par1[n] = 0;
            r->handleProcs->unlockProc(text);
            r->handleProcs->disposeProc(text);
        }
    }
    dp->readDescriptorProcs->closeReadDescriptorProc(token);
}

void writeDescriptor(pi::FilterRecord* r, const State& s) {
    pi::PIDescriptorParameters* dp = r->descriptorParameters;
    if (!dp) return;
    char text[700];
    std::snprintf(text, sizeof text, "tiles=%ld colors=%ld got=%s", s.tiles, s.colors, s.par1);
    pi::PIWriteDescriptor token = dp->writeDescriptorProcs->openWriteDescriptorProc();
    if (!token) return;
    const auto length = pi::int32(std::strlen(text) + 1);  // with its terminator, like our module
    pi::Handle h = r->handleProcs->newProc(length);
    if (h) {
        std::memcpy(r->handleProcs->lockProc(h, 1), text, std::size_t(length));
        r->handleProcs->unlockProc(h);
        dp->writeDescriptorProcs->putTextProc(token, pi::keyPar1, h);
    }
    pi::Handle out = nullptr;
    if (dp->writeDescriptorProcs->closeWriteDescriptorProc(token, &out) == 0) dp->descriptor = out;
}

int width(const pi::FilterRecord* r) { return r->filterRect.right - r->filterRect.left; }
int height(const pi::FilterRecord* r) { return r->filterRect.bottom - r->filterRect.top; }

// Publishes the current tile, or empty rectangles when tileY has run past the end.
void publish(pi::FilterRecord* r, const State& s) {
    const Config& c = s.cfg;
    if (s.tileY >= height(r)) {
        r->inRect = r->outRect = r->maskRect = {0, 0, 0, 0};
        return;
    }
    const int tw = c.tile ? c.tile : width(r), th = c.tile ? c.tile : height(r);
    const int left = r->filterRect.left + s.tileX, top = r->filterRect.top + s.tileY;
    const int right = left + tw < r->filterRect.right ? left + tw : r->filterRect.right;
    const int bottom = top + th < r->filterRect.bottom ? top + th : r->filterRect.bottom;
    const int m = c.margin;
    r->inRect = {pi::int16(top - m), pi::int16(left - m), pi::int16(bottom + m), pi::int16(right + m)};
    r->outRect = {pi::int16(top), pi::int16(left), pi::int16(bottom), pi::int16(right)};
    if (c.outMargin) {
        auto clampTo = [](int v, int lo, int hi) { return pi::int16(v < lo ? lo : v > hi ? hi : v); };
        r->outRect = {clampTo(top - m, r->filterRect.top, r->filterRect.bottom),
                      clampTo(left - m, r->filterRect.left, r->filterRect.right),
                      clampTo(bottom + m, r->filterRect.top, r->filterRect.bottom),
                      clampTo(right + m, r->filterRect.left, r->filterRect.right)};
    }
    r->maskRect = {0, 0, 0, 0};
    r->inLoPlane = r->outLoPlane = 0;
    r->inHiPlane = r->outHiPlane = pi::int16(r->planes - 1);
    r->inputPadding = pi::int16(c.inPad);
    r->outputPadding = pi::int16(c.outPad);
    r->inputRate = 1 << 16;
}

void advance(pi::FilterRecord* r, State& s) {
    const int tw = s.cfg.tile ? s.cfg.tile : width(r), th = s.cfg.tile ? s.cfg.tile : height(r);
    s.tileX += tw;
    if (s.tileX >= width(r)) {
        s.tileX = 0;
        s.tileY += th;
    }
}

// Processes the core of the current tile (the filter rectangle's part, without margin).
pi::OSErr process(pi::FilterRecord* r, State& s) {
    const int tw = s.cfg.tile ? s.cfg.tile : width(r), th = s.cfg.tile ? s.cfg.tile : height(r);
    const int left = r->filterRect.left + s.tileX, top = r->filterRect.top + s.tileY;
    const int right = left + tw < r->filterRect.right ? left + tw : r->filterRect.right;
    const int bottom = top + th < r->filterRect.bottom ? top + th : r->filterRect.bottom;
    const int bps = r->depth / 8;
    const int planes = r->planes;
    char* scratch = nullptr;
    if (s.scratch) {
        scratch = r->bufferProcs->lockProc(s.scratch, 1);
        if (!scratch) return pi::memFullErr;
    }
    for (int y = top; y < bottom; ++y)
        for (int x = left; x < right; ++x)
            for (int p = 0; p < planes; ++p) {
                const auto* in = static_cast<const unsigned char*>(r->inData) +
                                 (y - r->inRect.top) * r->inRowBytes + (x - r->inRect.left) * r->inColumnBytes +
                                 p * r->inPlaneBytes;
                auto* out = static_cast<unsigned char*>(r->outData) + (y - r->outRect.top) * r->outRowBytes +
                            (x - r->outRect.left) * r->outColumnBytes + p * r->outPlaneBytes;
                unsigned v = bps == 2 ? *reinterpret_cast<const pi::uint16*>(in) : *in;
                if (p < 3) v = (bps == 2 ? 32768u : 255u) - v;
                if (scratch) scratch[0] = char(v);  // touch the buffer: a bad address faults here
                if (bps == 2)
                    *reinterpret_cast<pi::uint16*>(out) = pi::uint16(v);
                else
                    *out = static_cast<unsigned char>(v);
            }
    if (scratch) r->bufferProcs->unlockProc(s.scratch);
    if (s.cfg.color && r->colorServices) {
        pi::ColorServicesInfo info{};
        info.infoSize = sizeof info;
        info.selector = pi::plugIncolorServicesConvertColor;
        info.sourceSpace = pi::plugIncolorServicesRGBSpace;
        info.resultSpace = pi::plugIncolorServicesHSBSpace;
        info.colorComponents[0] = 200, info.colorComponents[1] = 100, info.colorComponents[2] = 50;
        if (r->colorServices(&info) == 0) {
            info.sourceSpace = pi::plugIncolorServicesHSBSpace;
            info.resultSpace = pi::plugIncolorServicesRGBSpace;
            if (r->colorServices(&info) == 0 && info.colorComponents[0] == 200 && info.colorComponents[1] == 100 &&
                info.colorComponents[2] == 50)
                ++s.colors;
        }
    }
    ++s.tiles;
    r->progressProc(pi::int32(s.tiles), 0);
    return 0;
}

void onStart(pi::FilterRecord* r, State& s, pi::int16* result) {
    if (s.cfg.buffer > 0) {
        const pi::OSErr err = r->bufferProcs->allocateProc(s.cfg.buffer, &s.scratch);
        if (err != 0) {
            s.scratch = nullptr;
            *result = err;
            return;
        }
    }
    s.tileX = s.tileY = 0;
    publish(r, s);
    if (!s.cfg.advance) return;
    while (s.tileY < height(r)) {
        if (const pi::OSErr err = r->advanceState(); err != 0) {
            *result = err;
            return;
        }
        if (const pi::OSErr err = process(r, s); err != 0) {
            *result = err;
            return;
        }
        advance(r, s);
        publish(r, s);
    }
}

void onContinue(pi::FilterRecord* r, State& s, pi::int16* result) {
    if (s.cfg.fail) {
        *result = pi::int16(s.cfg.fail);
        return;
    }
    if (const pi::OSErr err = process(r, s); err != 0) {
        *result = err;
        return;
    }
    advance(r, s);
    publish(r, s);
    *result = 0;
}

void onFinish(pi::FilterRecord* r, State& s) {
    if (s.scratch) r->bufferProcs->freeProc(s.scratch);
    writeDescriptor(r, s);
}

}  // namespace

extern "C" __attribute__((visibility("default"))) void ENTRYPOINT(pi::int16 selector, pi::FilterRecord* r,
                                                                  intptr_t* data, pi::int16* result) {
    if (selector == pi::filterSelectorAbout) return;
    pi::Handle h = reinterpret_cast<pi::Handle>(*data);
    State* s = nullptr;
    if (!h) {
        h = r->handleProcs->newProc(sizeof(State));
        if (!h) {
            *result = pi::memFullErr;
            return;
        }
        *data = reinterpret_cast<intptr_t>(h);
        s = new (r->handleProcs->lockProc(h, 1)) State();
    } else {
        s = reinterpret_cast<State*>(r->handleProcs->lockProc(h, 1));
    }
    switch (selector) {
        case pi::filterSelectorPrepare:
            readDescriptor(r, *s);
            parse(*s);
            break;
        case pi::filterSelectorStart: onStart(r, *s, result); break;
        case pi::filterSelectorContinue: onContinue(r, *s, result); break;
        case pi::filterSelectorFinish:
            onFinish(r, *s);
            s->~State();
            r->handleProcs->disposeProc(h);
            *data = 0;
            return;
        default: break;
    }
    r->handleProcs->unlockProc(h);
}

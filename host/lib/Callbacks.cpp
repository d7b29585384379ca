// The callbacks a filter receives. Each finds the running session through Session::Impl::current()
// and never lets an exception out: a failure becomes the interface's null or error result.
#include <cstring>

#include "SessionImpl.h"
#include "noctiva/host/ColorServices.h"

namespace noctiva::host {

namespace {

using Impl = Session::Impl;

// Runs `body` with the current session; `fallback` when there is none or the body throws.
template <typename R, typename Body>
R withSession(R fallback, Body body) noexcept {
    Impl* s = Impl::current();
    if (!s) return fallback;
    try {
        return body(*s);
    } catch (...) {
        return fallback;
    }
}

template <typename Body>
void withSessionVoid(Body body) noexcept {
    Impl* s = Impl::current();
    if (!s) return;
    try {
        body(*s);
    } catch (...) {
    }
}

// Direct callbacks.

pi::Boolean abortProc() { return 0; }

void progressProc(pi::int32 done, pi::int32 total) {
    withSessionVoid([&](Impl& s) { s.progress(done, total); });
}

pi::OSErr advanceStateProc() {
    return withSession<pi::OSErr>(pi::paramErr, [](Impl& s) { return s.advanceState(); });
}

pi::OSErr colorServicesProc(pi::ColorServicesInfo* info) {
    return withSession<pi::OSErr>(pi::paramErr, [&](Impl& s) -> pi::OSErr {
        s.countColorService();
        if (!info) return pi::paramErr;
        if (info->selector != pi::plugIncolorServicesConvertColor) return pi::errPlugInHostInsufficient;
        const pi::OSErr err = convertColor(info->sourceSpace, info->resultSpace, info->colorComponents);
        info->resultGamutInfoValid = 0;
        return err;
    });
}

// Handle suite.

pi::Handle handleNew(pi::int32 size) {
    return withSession<pi::Handle>(nullptr, [&](Impl& s) { return s.handles.allocate(size); });
}
void handleDispose(pi::Handle h) {
    withSessionVoid([&](Impl& s) {
        if (h && !s.handles.dispose(h)) s.protocolWarning();
    });
}
pi::int32 handleGetSize(pi::Handle h) {
    return withSession<pi::int32>(0, [&](Impl& s) { return s.handles.size(h); });
}
pi::OSErr handleSetSize(pi::Handle h, pi::int32 size) {
    return withSession<pi::OSErr>(pi::paramErr, [&](Impl& s) { return s.handles.resize(h, size); });
}
pi::Ptr handleLock(pi::Handle h, pi::Boolean) {
    return withSession<pi::Ptr>(nullptr, [&](Impl& s) { return s.handles.lock(h); });
}
void handleUnlock(pi::Handle h) {
    withSessionVoid([&](Impl& s) {
        if (h && !s.handles.unlock(h)) s.protocolWarning();
    });
}
void handleRecoverSpace(pi::int32) {}

// Buffer suite.

pi::OSErr bufferAllocate(pi::int32 size, pi::BufferID* id) {
    return withSession<pi::OSErr>(pi::memFullErr, [&](Impl& s) { return s.buffers.allocate(size, id); });
}
pi::Ptr bufferLock(pi::BufferID id, pi::Boolean) {
    return withSession<pi::Ptr>(nullptr, [&](Impl& s) { return s.buffers.lock(id); });
}
void bufferUnlock(pi::BufferID id) {
    withSessionVoid([&](Impl& s) {
        if (!s.buffers.unlock(id)) s.protocolWarning();
    });
}
void bufferFree(pi::BufferID id) {
    withSessionVoid([&](Impl& s) {
        if (!s.buffers.release(id)) s.protocolWarning();
    });
}
pi::int32 bufferSpace() {
    return withSession<pi::int32>(0, [](Impl& s) { return pi::int32(std::min<std::int64_t>(s.buffers.space(), INT32_MAX)); });
}

// Read descriptor suite.

pi::PIReadDescriptor readOpen(pi::Handle descriptor, pi::uint32* keyArray) {
    return withSession<pi::PIReadDescriptor>(nullptr, [&](Impl& s) -> pi::PIReadDescriptor {
        if (!descriptor) return nullptr;
        auto items = readDescriptor(s.handles, descriptor);
        if (!items) {
            s.protocolWarning();
            return nullptr;
        }
        return s.tokens.openRead(std::move(*items), keyArray);
    });
}

pi::OSErr readClose(pi::PIReadDescriptor token) {
    return withSession<pi::OSErr>(pi::paramErr, [&](Impl& s) -> pi::OSErr {
        auto t = s.tokens.closeRead(token);
        if (!t) {
            s.protocolWarning();
            return pi::paramErr;
        }
        return t->sticky;
    });
}

pi::Boolean readGetKey(pi::PIReadDescriptor token, pi::uint32* key, pi::uint32* type, pi::int32* flags) {
    return withSession<pi::Boolean>(0, [&](Impl& s) -> pi::Boolean {
        ReadToken* t = s.tokens.read(token);
        if (!t || t->next >= t->items.size()) return 0;
        t->current = t->next++;
        t->started = true;
        const DescriptorItem& item = t->items[t->current];
        if (key) *key = item.key;
        if (type) *type = item.type;
        if (flags) *flags = 0;
        // A returned key is crossed out of the caller's list; what remains is missing.
        if (t->keyArray)
            for (pi::uint32* k = t->keyArray; *k; ++k)
                if (*k == item.key) *k = pi::typeNull;
        return 1;
    });
}

// The item getKey returned last, or null (and a sticky error) when there is none.
const DescriptorItem* currentItem(Impl& s, pi::PIReadDescriptor token, pi::uint32 type) {
    ReadToken* t = s.tokens.read(token);
    if (!t) return nullptr;
    if (!t->started || t->items[t->current].type != type) {
        t->sticky = pi::paramErr;
        return nullptr;
    }
    return &t->items[t->current];
}

pi::OSErr readGetInteger(pi::PIReadDescriptor token, pi::int32* value) {
    return withSession<pi::OSErr>(pi::paramErr, [&](Impl& s) -> pi::OSErr {
        const DescriptorItem* item = currentItem(s, token, pi::typeInteger);
        if (!item || !value) return pi::paramErr;
        *value = item->integer;
        return pi::noErr;
    });
}

pi::OSErr readGetPinnedInteger(pi::PIReadDescriptor token, pi::int32 min, pi::int32 max, pi::int32* value) {
    return withSession<pi::OSErr>(pi::paramErr, [&](Impl& s) -> pi::OSErr {
        const DescriptorItem* item = currentItem(s, token, pi::typeInteger);
        if (!item || !value) return pi::paramErr;
        *value = item->integer < min ? min : item->integer > max ? max : item->integer;
        return pi::OSErr(*value == item->integer ? 0 : 2);  // 2: the value was coerced
    });
}

pi::OSErr readGetText(pi::PIReadDescriptor token, pi::Handle* value) {
    return withSession<pi::OSErr>(pi::paramErr, [&](Impl& s) -> pi::OSErr {
        const DescriptorItem* item = currentItem(s, token, pi::typeText);
        if (!item || !value) return pi::paramErr;
        // The text without terminator: its length is the handle's size. The module disposes it.
        pi::Handle h = s.handles.allocate(pi::int32(item->text.size()));
        if (!h) return pi::memFullErr;
        std::memcpy(*h, item->text.data(), item->text.size());
        *value = h;
        return pi::noErr;
    });
}

// Write descriptor suite.

pi::PIWriteDescriptor writeOpen() {
    return withSession<pi::PIWriteDescriptor>(nullptr, [](Impl& s) { return s.tokens.openWrite(); });
}

pi::OSErr writeClose(pi::PIWriteDescriptor token, pi::Handle* descriptor) {
    return withSession<pi::OSErr>(pi::paramErr, [&](Impl& s) -> pi::OSErr {
        auto t = s.tokens.closeWrite(token);
        if (!t || !descriptor) {
            s.protocolWarning();
            return pi::paramErr;
        }
        pi::Handle h = makeDescriptor(s.handles, t->items);
        if (!h) return pi::memFullErr;
        *descriptor = h;
        return pi::noErr;
    });
}

void putItem(WriteToken& t, DescriptorItem item) {
    for (auto& existing : t.items)
        if (existing.key == item.key) {
            existing = std::move(item);
            return;
        }
    t.items.push_back(std::move(item));
}

pi::OSErr writePutInteger(pi::PIWriteDescriptor token, pi::uint32 key, pi::int32 value) {
    return withSession<pi::OSErr>(pi::paramErr, [&](Impl& s) -> pi::OSErr {
        WriteToken* t = s.tokens.write(token);
        if (!t) return pi::paramErr;
        putItem(*t, {key, pi::typeInteger, value, {}});
        return pi::noErr;
    });
}

pi::OSErr writePutText(pi::PIWriteDescriptor token, pi::uint32 key, pi::Handle text) {
    return withSession<pi::OSErr>(pi::paramErr, [&](Impl& s) -> pi::OSErr {
        WriteToken* t = s.tokens.write(token);
        if (!t || !text || !s.handles.contains(text)) return pi::paramErr;
        std::string value(*text, std::size_t(s.handles.size(text)));
        // Modules differ on the terminator: accept the text with or without one.
        if (!value.empty() && value.back() == '\0') value.pop_back();
        putItem(*t, {key, pi::typeText, 0, std::move(value)});
        // Some modules hand the handle over, others dispose it themselves; either is fine.
        s.handles.setHostOwned(text);
        return pi::noErr;
    });
}

// Procs we do not offer: present (so the table is complete) but refusing.
template <typename... Args>
pi::OSErr notOffered(Args...) {
    return pi::errPlugInHostInsufficient;
}

CallbackTables makeTables() {
    CallbackTables t{};
    t.handleProcs = {pi::kCurrentHandleProcsVersion, pi::kCurrentHandleProcsCount, handleNew, handleDispose,
                     handleGetSize, handleSetSize, handleLock, handleUnlock, handleRecoverSpace, handleDispose};
    t.bufferProcs = {pi::kCurrentBufferProcsVersion, pi::kCurrentBufferProcsCount,
                     bufferAllocate, bufferLock, bufferUnlock, bufferFree, bufferSpace, nullptr, nullptr, nullptr};
    pi::ReadDescriptorProcs& r = t.readProcs;
    r.readDescriptorProcsVersion = pi::kCurrentReadDescriptorProcsVersion;
    r.numReadDescriptorProcs = pi::kCurrentReadDescriptorProcsCount;
    r.openReadDescriptorProc = readOpen;
    r.closeReadDescriptorProc = readClose;
    r.getKeyProc = readGetKey;
    r.getIntegerProc = readGetInteger;
    r.getFloatProc = notOffered<pi::PIReadDescriptor, double*>;
    r.getUnitFloatProc = notOffered<pi::PIReadDescriptor, pi::uint32*, double*>;
    r.getBooleanProc = notOffered<pi::PIReadDescriptor, pi::Boolean*>;
    r.getTextProc = readGetText;
    r.getAliasProc = notOffered<pi::PIReadDescriptor, pi::Handle*>;
    r.getEnumeratedProc = notOffered<pi::PIReadDescriptor, pi::uint32*>;
    r.getClassProc = notOffered<pi::PIReadDescriptor, pi::uint32*>;
    r.getSimpleReferenceProc = notOffered<pi::PIReadDescriptor, void*>;
    r.getObjectProc = notOffered<pi::PIReadDescriptor, pi::uint32*, pi::Handle*>;
    r.getCountProc = notOffered<pi::PIReadDescriptor, pi::uint32*>;
    r.getStringProc = notOffered<pi::PIReadDescriptor, pi::uint8 (*)[256]>;
    r.getPinnedIntegerProc = readGetPinnedInteger;
    r.getPinnedFloatProc = notOffered<pi::PIReadDescriptor, const double*, const double*, double*>;
    r.getPinnedUnitFloatProc = notOffered<pi::PIReadDescriptor, const double*, const double*, pi::uint32*, double*>;
    pi::WriteDescriptorProcs& w = t.writeProcs;
    w.writeDescriptorProcsVersion = pi::kCurrentWriteDescriptorProcsVersion;
    w.numWriteDescriptorProcs = pi::kCurrentWriteDescriptorProcsCount;
    w.openWriteDescriptorProc = writeOpen;
    w.closeWriteDescriptorProc = writeClose;
    w.putIntegerProc = writePutInteger;
    w.putFloatProc = notOffered<pi::PIWriteDescriptor, pi::uint32, const double*>;
    w.putUnitFloatProc = notOffered<pi::PIWriteDescriptor, pi::uint32, pi::uint32, const double*>;
    w.putBooleanProc = notOffered<pi::PIWriteDescriptor, pi::uint32, pi::Boolean>;
    w.putTextProc = writePutText;
    w.putAliasProc = notOffered<pi::PIWriteDescriptor, pi::uint32, pi::Handle>;
    w.putEnumeratedProc = notOffered<pi::PIWriteDescriptor, pi::uint32, pi::uint32, pi::uint32>;
    w.putClassProc = notOffered<pi::PIWriteDescriptor, pi::uint32, pi::uint32>;
    w.putSimpleReferenceProc = notOffered<pi::PIWriteDescriptor, pi::uint32, const void*>;
    w.putObjectProc = notOffered<pi::PIWriteDescriptor, pi::uint32, pi::uint32, pi::Handle>;
    w.putCountProc = notOffered<pi::PIWriteDescriptor, pi::uint32, pi::uint32>;
    w.putStringProc = notOffered<pi::PIWriteDescriptor, pi::uint32, const pi::uint8*>;
    w.putScopedClassProc = notOffered<pi::PIWriteDescriptor, pi::uint32, pi::uint32>;
    w.putScopedObjectProc = notOffered<pi::PIWriteDescriptor, pi::uint32, pi::uint32, pi::Handle>;
    t.abort = abortProc;
    t.progress = progressProc;
    t.advanceState = advanceStateProc;
    t.colorServices = colorServicesProc;
    return t;
}

}  // namespace

const CallbackTables& callbackTables() {
    static const CallbackTables tables = makeTables();
    return tables;
}

}  // namespace noctiva::host

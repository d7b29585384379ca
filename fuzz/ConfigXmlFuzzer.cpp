// The configuration store's XML reader. A failed load leaves the store as it was; a successful one
// serialises to a text that loads again into the same serialisation (but for old error texts).
#include <cstddef>
#include <cstdint>
#include <cstdlib>

#include "config/Configuration.h"
#include "lib/debug/Log.h"

using vek::plugin_common::Configuration;
using vek::text::FastString;

namespace {
constexpr std::size_t kMaxInput = 16 * 1024;
}

extern "C" int LLVMFuzzerInitialize(int*, char***) {
    vek::debug::setConsoleLevel(vek::debug::Level::Off);
    return 0;
}

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    if (size > kMaxInput) return 0;
    const FastString text(reinterpret_cast<const char*>(data), size);

    Configuration store;
    store.addGroup("before");
    const FastString before = store.serialize();
    if (!store.deserialize(text)) {
        if (store.serialize() != before) std::abort();  // a failed load changes nothing
        return 0;
    }
    const FastString once = store.serialize();
    Configuration again;
    if (!again.deserialize(once)) std::abort();
    // A value of an unknown type loads as a string, and a string holding "Couldn't convert" is
    // refused on load (it is an old error text), so such a value is dropped on its second load.
    if (once.contains("Couldn't convert")) return 0;
    if (again.serialize() != once) std::abort();
    return 0;
}

// The localisation catalogue reader: any document either adds texts under the prefix or nothing,
// and every text it added can be looked up again.
#include <cstddef>
#include <cstdint>
#include <cstdlib>
#include <iostream>
#include <string>
#include <string_view>

#include "ui/Localization.h"

namespace {
constexpr std::size_t kMaxInput = 16 * 1024;
}

// The reader reports each malformed document on std::cerr; the sanitizers and libFuzzer do not use it.
extern "C" int LLVMFuzzerInitialize(int*, char***) {
    std::cerr.rdbuf(nullptr);
    return 0;
}

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    if (size > kMaxInput) return 0;
    const std::string_view text(reinterpret_cast<const char*>(data), size);

    // A fresh catalogue for each input, in a fixed language (no settings file is read).
    ReleaseLocalization();
    CreateCatalog(Language{});
    LoadCatalogText(text, "@Fuzz");
    const TextCatalog* catalog = TextCatalog::current();
    if (catalog == nullptr) std::abort();
    (void)Translate("@Fuzz.DialogButtons.OK.Label");
    (void)Translate("@Fuzz");
    ReleaseLocalization();
    return 0;
}

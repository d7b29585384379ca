// The settings text the module reads from 'par1' (signature removed), read into the whole shadow
// chain. Whatever is read must write back as a text that reads back to the same fields.
#include <cstddef>
#include <cstdint>
#include <cstdlib>
#include <cstring>
#include <memory>
#include <string>

#include "kernel/FilterAction.h"
#include "steps/ShadowChain.h"
#include "steps/Step1.h"
#include "steps/Step2.h"
#include "steps/Step3.h"
#include "steps/Step4.h"
#include "support/MallocHost.h"

namespace {

constexpr std::size_t kMaxInput = 16 * 1024;

struct Chain {
    testsupport::MallocHost host;
    std::unique_ptr<cRGB32FilterAction> action;
    Chain() {
        auto* step2 = new cStep2(nullptr, &host, nullptr, nullptr);
        step2->mode = 104;
        action.reset(buildShadowAction(new cStep1(nullptr, &host, nullptr, nullptr), step2,
                                       new cStep3(nullptr, &host, nullptr, nullptr),
                                       new cStep4(nullptr, &host, nullptr, nullptr)));
    }
};

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    if (size > kMaxInput) return 0;
    const std::string text(reinterpret_cast<const char*>(data), size);  // stops at an embedded zero when read

    // Two chains for the whole process (building one costs more than reading); the complete default
    // text puts every field back first, so each input starts from the same state.
    static Chain first, second;
    static const std::string defaults = writeShadowParameters(*first.action);
    readShadowParameters(*first.action, defaults.c_str());

    readShadowParameters(*first.action, text.c_str());
    const std::string written = writeShadowParameters(*first.action);
    readShadowParameters(*second.action, written.c_str());
    if (writeShadowParameters(*second.action) != written) std::abort();

    // A bounded write never passes its capacity and stays terminated.
    char small[97];
    std::memset(small, 0x7F, sizeof small);
    const std::size_t n = writeShadowParameters(*first.action, small, sizeof small - 1);
    if (n >= sizeof small - 1 || small[n] != '\0' || small[sizeof small - 1] != 0x7F) std::abort();
    return 0;
}

// A module with Noctiva's resources whose entry point faults: the Windows host must report the
// crash and exit non-zero instead of hanging on a dialog.
#include <cstdint>

extern "C" __declspec(dllexport) void ENTRYPOINT(std::int16_t selector, void*, std::intptr_t*, std::int16_t* result) {
    if (selector == 0) return;
    volatile int* nowhere = nullptr;
    *result = std::int16_t(*nowhere);
}

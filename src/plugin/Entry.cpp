// The module's one export. Every call but About locks the filter object out of its host handle,
// dispatches and unlocks it; no exception ever reaches the host.
#include <exception>
#include <new>

#include "kernel/Host.h"
#include "kernel/Memory/MEM.h"
#include "plugin/Filter.h"
#include "plugin/PluginState.h"

namespace {

pi::Handle dataHandle() { return reinterpret_cast<pi::Handle>(*plugin::gData); }

void unlockObject() {
    const pi::HandleProcs* procs = plugin::gFilterRecord->handleProcs;
    if (*plugin::gData != 0 && procs != nullptr && procs->unlockProc) procs->unlockProc(dataHandle());
}

// After a failure the run's whole state goes at once (the host may not call Finish after a failed
// Prepare or Start); the cleared data cell lets a later Finish end the run as a no-op.
void abandonRun(cFilter* filter) noexcept {
    try {
        delete filter;
    } catch (...) {
    }
    KERNEL::setMemoryHost(nullptr);
    KERNEL::setConversionHost(nullptr);
}

}  // namespace

#ifdef _WIN32
#define NOCTIVA_EXPORT  // Noctiva.def names the one export
#else
#define NOCTIVA_EXPORT __attribute__((visibility("default")))
#endif

extern "C" NOCTIVA_EXPORT void ENTRYPOINT(pi::int16 selector, pi::FilterRecord* filterRecord,
                                          intptr_t* data, pi::int16* result) {
    if (selector == pi::filterSelectorAbout) return;
    if (filterRecord == nullptr || data == nullptr || result == nullptr) return;
    plugin::gFilterRecord = filterRecord;
    plugin::gData = data;
    plugin::gResult = result;

    // Nothing to finish without an object (a run that failed earlier, or a stray Finish).
    if (*data == 0 && selector == pi::filterSelectorFinish) return;

    cFilter* filter = nullptr;
    pi::OSErr failure = pi::noErr;
    try {
        if (*data == 0) {
            filter = new cNoctiva(filterRecord->filterRect);
        } else if (const pi::HandleProcs* procs = filterRecord->handleProcs; procs && procs->lockProc) {
            filter = reinterpret_cast<cFilter*>(procs->lockProc(dataHandle(), true));
        }
        if (filter == nullptr) {
            *result = pi::memFullErr;
            return;
        }
        filter->Dispatch(selector, filterRecord, data, result);
    } catch (const KERNEL::cMEMException&) {
        failure = pi::memFullErr;
    } catch (const std::bad_alloc&) {
        failure = pi::memFullErr;
    } catch (...) {
        failure = pi::paramErr;
    }
    if (failure != pi::noErr) {
        abandonRun(filter);
        *result = failure;
        return;
    }
    unlockObject();
}

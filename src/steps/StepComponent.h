// The frame every step of the shadow chain shares: a pipe that knows the host and has a `mode`
// (0 bypasses the step: its node hands the upstream block on).
#pragma once

#include <cstdint>
#include <vector>

#include "kernel/Component.h"

namespace KERNEL {
class cHost;
}

class cControllComponent : public KERNEL::cPipe {
public:
    explicit cControllComponent(KERNEL::cHost* host) : host(host) {}
    virtual void* GetController() const { return controller; }
    KERNEL::cHost* Host() const { return host; }

protected:
    // Kept for the interface; this filter never sets them.
    void* controller = nullptr;
    void* link = nullptr;
    KERNEL::cHost* host;
    std::vector<void*> children;
};

class cStepComponent : public cControllComponent {
public:
    cStepComponent(KERNEL::cHost* host, void* value) : cControllComponent(host), value(value) {}

    // Registers `mode`; steps register their own fields first.
    void BindNode(KERNEL::__cFilterComponent__* node) override;
    void GetBorder(int32_t& bx, int32_t& by) override {}
    void Reset() override {}
    bool ProducesOutput() override { return mode != 0; }

    int32_t mode = 0;

protected:
    std::vector<void*> observers;
    void* value;
};

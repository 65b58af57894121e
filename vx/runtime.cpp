#include "vx/runtime.h"

bool VxErrorEvent::setHandler(int slot, Handler h) {
    if (slot < 0 || slot >= kSlots) return false;
    std::lock_guard<std::recursive_mutex> g(mutex_);
    slots_[slot] = std::move(h);
    return true;
}

void VxErrorEvent::clear() {
    std::lock_guard<std::recursive_mutex> g(mutex_);
    for (auto& s : slots_) s = nullptr;
}

int VxErrorEvent::raise(VxEngineObject* sender, const VxErrorEventArgs& args) {
    Handler copy[kSlots];
    {
        std::lock_guard<std::recursive_mutex> g(mutex_);
        for (int i = 0; i < kSlots; ++i) copy[i] = slots_[i];
    }
    int ran = 0;
    for (auto& h : copy) {
        if (!h) continue;
        try {
            h(sender, args);
        } catch (...) {
            return ran;
        }
        ++ran;
    }
    return ran;
}

VxErrorEvent& VxRuntime::errorEvent() {
    static VxErrorEvent e;
    return e;
}

#pragma once
// Process-wide error event: up to three handlers; a handler that throws stops the
// rest, and its exception is swallowed so that reporting can never fail the caller.
#include <functional>
#include <mutex>

#include "vx/refcnt.h"
#include "vx/string.h"

class VxEngineObject;

struct VxErrorEventArgs {
    VxString message;
};

class VxErrorEvent {
public:
    using Handler = std::function<void(VxEngineObject* sender, const VxErrorEventArgs& args)>;
    static constexpr int kSlots = 3;

    // Installs a handler in slot 0..2 (an empty function clears it); false for a bad slot.
    bool setHandler(int slot, Handler h);
    void clear();
    // Calls the handlers in slot order; returns how many ran to completion.
    int raise(VxEngineObject* sender, const VxErrorEventArgs& args);

private:
    std::recursive_mutex mutex_;
    Handler slots_[kSlots];
};

class VxRuntime {
public:
    static VxErrorEvent& errorEvent();
};

#include "vx/engineobject.h"

#include <atomic>
#include <functional>

VxEngineObject::~VxEngineObject() = default;

const VxRuntimeClass* VxEngineObject::runtimeClass() {
    static const VxRuntimeClass rc{"VxEngineObject", nullptr, 0};
    return &rc;
}

int VxEngineObject::classId() {
    static const int id = initClassId(runtimeClass());
    return id;
}

int VxEngineObject::initClassId(const VxRuntimeClass* rc) {
    static std::mutex m;
    static std::map<const VxRuntimeClass*, int> ids;
    std::lock_guard<std::mutex> g(m);
    auto it = ids.find(rc);
    if (it != ids.end()) return it->second;
    int id = static_cast<int>(ids.size()) + 1;
    ids[rc] = id;
    return id;
}

VxRef<VxEngineObject> VxEngineObject::cloneWithMap(VxOperatorMap*) const { return nullptr; }

VxRef<VxEngineObject> VxEngineObject::findChildObject(const VxString& name, int mode) const {
    std::vector<VxRef<VxEngineObject>> children;
    getMyChildObjects(children);
    for (auto& c : children)
        if (c && c->engineName() == name) return c;
    if (mode == 1) {
        for (auto& c : children) {
            if (!c) continue;
            if (auto found = c->findChildObject(name, 1)) return found;
        }
    }
    return nullptr;
}

void VxEngineObject::toXml(VxXmlSerializer*, TiXmlElement*, const VxString&, bool) const {}

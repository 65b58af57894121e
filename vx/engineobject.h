#pragma once
// Engine objects: counted, with a runtime class identity, clonable through an operator map.
#include <map>
#include <mutex>
#include <vector>

#include "vx/refcnt.h"
#include "vx/string.h"

class VxEngineObject;
class TiXmlElement;
class VxXmlSerializer;

// Class identity: name, parent class and the code of the module that defines it.
struct VxRuntimeClass {
    const char* name;
    const VxRuntimeClass* parent;
    int moduleCode;
    bool isKindOf(const VxRuntimeClass* other) const {
        for (const VxRuntimeClass* c = this; c; c = c->parent)
            if (c == other) return true;
        return false;
    }
};

// Maps originals to their copies while a tree of objects is cloned.
class VxOperatorMap {
public:
    void put(const VxEngineObject* original, VxEngineObject* copy) { map_[original] = copy; }
    VxEngineObject* find(const VxEngineObject* original) const {
        auto it = map_.find(original);
        return it == map_.end() ? nullptr : it->second;
    }
private:
    std::map<const VxEngineObject*, VxEngineObject*> map_;
};

class VxEngineObject : public VxRefCnt {
public:
    VxEngineObject() = default;
    VxEngineObject(const VxEngineObject&) : VxRefCnt() {}
    ~VxEngineObject() override;

    // Identity
    static int classId();
    static const VxRuntimeClass* runtimeClass();
    virtual int myClassId_() const { return classId(); }
    virtual const VxRuntimeClass* myRuntimeClass_() const { return runtimeClass(); }
    virtual VxString myRuntimeClassName() const { return myRuntimeClass_()->name; }
    bool isKindOf(const VxRuntimeClass* c) const { return myRuntimeClass_()->isKindOf(c); }
    // Assigns a process-unique id to a runtime class once; thread-safe.
    static int initClassId(const VxRuntimeClass* rc);

    // Copies
    virtual VxRef<VxEngineObject> clone() const { return cloneWithMap(nullptr); }
    virtual VxRef<VxEngineObject> cloneWithMap(VxOperatorMap* map) const;

    // Children and naming for look-ups
    virtual VxString engineName() const { return VxString(); }
    virtual void getMyChildObjects(std::vector<VxRef<VxEngineObject>>& out) const { (void)out; }
    // mode 0: direct children; mode 1: descendants at any depth (depth first, in order).
    VxRef<VxEngineObject> findChildObject(const VxString& name, int mode) const;

    // Locking for objects that guard their state
    virtual bool isLockable() const { return false; }
    virtual void lock() const {}
    virtual void unlock() const {}

    // Configuration writing; objects without a writer write nothing.
    virtual void toXml(VxXmlSerializer* s, TiXmlElement* parent, const VxString& property,
                       bool isPublic) const;

    virtual void notifyChanged() {}
};

// Declares and defines the static identity of a class with the given parent and module code.
#define VX_DECLARE_CLASS()                                              \
public:                                                                 \
    static int classId();                                               \
    static const VxRuntimeClass* runtimeClass();                        \
    int myClassId_() const override { return classId(); }               \
    const VxRuntimeClass* myRuntimeClass_() const override { return runtimeClass(); }

#define VX_IMPLEMENT_CLASS(Cls, Parent, code)                           \
    const VxRuntimeClass* Cls::runtimeClass() {                         \
        static const VxRuntimeClass rc{#Cls, Parent::runtimeClass(), code}; \
        return &rc;                                                     \
    }                                                                   \
    int Cls::classId() {                                                \
        static const int id = VxEngineObject::initClassId(runtimeClass()); \
        return id;                                                      \
    }

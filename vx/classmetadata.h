#pragma once
// The description of a configurable class: its configuration name and the reader that
// builds an object from the class's element.
#include "vx/refcnt.h"
#include "vx/string.h"

class TiXmlElement;
class VxXmlParserContext;

class ClassMetaData {
public:
    explicit ClassMetaData(const VxString& className) : className_(className) {}
    ClassMetaData(const ClassMetaData&) = delete;
    ClassMetaData& operator=(const ClassMetaData&) = delete;
    virtual ~ClassMetaData();

    const VxString& className() const { return className_; }
    virtual VxRef<VxRefCnt> parseElement(VxXmlParserContext& ctx, const TiXmlElement* element) = 0;

private:
    VxString className_;
};

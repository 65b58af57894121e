#pragma once
// Decides what becomes of a configuration that cannot be read as written. This policy
// reports each problem as a WARNING line and yields null, so that the reader skips the
// value and goes on; a stricter one can be installed in the parser context.
#include "vx/refcnt.h"
#include "vx/string.h"

class TiXmlElement;
class VxXmlParserContext;

class ErrorHandler {
public:
    ErrorHandler() = default;
    ErrorHandler(const ErrorHandler&) = delete;
    ErrorHandler& operator=(const ErrorHandler&) = delete;
    virtual ~ErrorHandler();

    // A text that names no value of an enumerated type.
    virtual VxRef<VxRefCnt> unknownEnumValue(const VxString& typeName, const VxString& text);
    // An element handed to the reader of another class.
    virtual VxRef<VxRefCnt> classElementMismatch(const char* file, int line, VxXmlParserContext& ctx,
                                                 const TiXmlElement* element,
                                                 const VxString& expectedClass);
    virtual VxRef<VxRefCnt> requiredPropertyValueMissing(const char* file, int line,
                                                         VxXmlParserContext& ctx,
                                                         const TiXmlElement* element,
                                                         const VxString& property);
    virtual VxRef<VxRefCnt> propertyValueOfIncompatibleType(const char* file, int line,
                                                            VxXmlParserContext& ctx,
                                                            const TiXmlElement* element,
                                                            const VxString& property,
                                                            const VxString& typeName);
};

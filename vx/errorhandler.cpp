#include "vx/errorhandler.h"

#include <tinyxml.h>

#include "vx/log.h"

namespace {
std::string nameOf(const TiXmlElement* e) { return e ? e->ValueStr() : std::string(); }
}

ErrorHandler::~ErrorHandler() = default;

VxRef<VxRefCnt> ErrorHandler::unknownEnumValue(const VxString& typeName, const VxString& text) {
    VxLog::logf(VxLog::Warning, "Unknown value \"%1%\" for type %2%", text, typeName);
    return nullptr;
}

VxRef<VxRefCnt> ErrorHandler::classElementMismatch(const char* file, int line, VxXmlParserContext&,
                                                   const TiXmlElement* element,
                                                   const VxString& expectedClass) {
    VxLog::logf(VxLog::Warning, "Element \"%1%\" cannot be read as class %2% (%3%:%4%)",
                nameOf(element), expectedClass, file, line);
    return nullptr;
}

VxRef<VxRefCnt> ErrorHandler::requiredPropertyValueMissing(const char* file, int line,
                                                           VxXmlParserContext&,
                                                           const TiXmlElement* element,
                                                           const VxString& property) {
    VxLog::logf(VxLog::Warning, "Required property %1% missing in element \"%2%\" (%3%:%4%)",
                property, nameOf(element), file, line);
    return nullptr;
}

VxRef<VxRefCnt> ErrorHandler::propertyValueOfIncompatibleType(const char* file, int line,
                                                              VxXmlParserContext&,
                                                              const TiXmlElement* element,
                                                              const VxString& property,
                                                              const VxString& typeName) {
    VxLog::logf(VxLog::Warning,
                "Property %1% in element \"%2%\" is not of type %3% (%4%:%5%)", property,
                nameOf(element), typeName, file, line);
    return nullptr;
}

#pragma once
// State shared by everything that reads one configuration: the registered class
// descriptions and value converters, the file's format version and the error policy.
// A context belongs to one reader at a time.
#include <memory>
#include <utility>
#include <vector>

#include "vx/errorhandler.h"
#include "vx/refcnt.h"
#include "vx/string.h"

class ClassMetaData;

class VxXmlParserContext {
public:
    // Turns a configuration text into a value of one named type.
    using TypeConverter = VxRef<VxRefCnt> (*)(const VxString& text, VxXmlParserContext& ctx);

    VxXmlParserContext();
    VxXmlParserContext(const VxXmlParserContext&) = delete;
    VxXmlParserContext& operator=(const VxXmlParserContext&) = delete;
    ~VxXmlParserContext();

    // Class descriptions, by class name. The context keeps the pointer, not the object;
    // a second description under a taken name replaces the first.
    void registerClass(ClassMetaData* md);
    // Removes the entry only when it is this very description.
    void unregisterClass(ClassMetaData* md);
    ClassMetaData* findClass(const VxString& className) const;
    // In registration order.
    std::vector<VxString> classNames() const;

    void registerTypeConverter(const VxString& typeName, TypeConverter converter);
    void unregisterTypeConverter(const VxString& typeName);
    TypeConverter findTypeConverter(const VxString& typeName) const;
    std::vector<VxString> typeConverterNames() const;

    const VxString& formatVersion() const { return formatVersion_; }
    void formatVersion(const VxString& v) { formatVersion_ = v; }

    ErrorHandler& errorHandler() { return *errorHandler_; }
    // Null restores the default policy.
    void setErrorHandler(std::unique_ptr<ErrorHandler> handler);

private:
    std::vector<std::pair<VxString, ClassMetaData*>> classes_;
    std::vector<std::pair<VxString, TypeConverter>> converters_;
    VxString formatVersion_;
    std::unique_ptr<ErrorHandler> errorHandler_;
};

#include "vx/xmlparsercontext.h"

#include <algorithm>

#include "vx/classmetadata.h"

namespace {
template <class V>
auto findName(V& v, const VxString& name) {
    return std::find_if(v.begin(), v.end(), [&](const auto& e) { return e.first == name; });
}
template <class V>
std::vector<VxString> namesOf(const V& v) {
    std::vector<VxString> out;
    for (const auto& e : v) out.push_back(e.first);
    return out;
}
}  // namespace

VxXmlParserContext::VxXmlParserContext() : errorHandler_(new ErrorHandler) {}
VxXmlParserContext::~VxXmlParserContext() = default;

void VxXmlParserContext::registerClass(ClassMetaData* md) {
    if (!md) return;
    auto it = findName(classes_, md->className());
    if (it != classes_.end()) it->second = md;
    else classes_.emplace_back(md->className(), md);
}

void VxXmlParserContext::unregisterClass(ClassMetaData* md) {
    if (!md) return;
    auto it = findName(classes_, md->className());
    if (it != classes_.end() && it->second == md) classes_.erase(it);
}

ClassMetaData* VxXmlParserContext::findClass(const VxString& className) const {
    auto it = findName(classes_, className);
    return it == classes_.end() ? nullptr : it->second;
}

std::vector<VxString> VxXmlParserContext::classNames() const { return namesOf(classes_); }

void VxXmlParserContext::registerTypeConverter(const VxString& typeName, TypeConverter converter) {
    if (!converter) return;
    auto it = findName(converters_, typeName);
    if (it != converters_.end()) it->second = converter;
    else converters_.emplace_back(typeName, converter);
}

void VxXmlParserContext::unregisterTypeConverter(const VxString& typeName) {
    auto it = findName(converters_, typeName);
    if (it != converters_.end()) converters_.erase(it);
}

VxXmlParserContext::TypeConverter VxXmlParserContext::findTypeConverter(const VxString& typeName) const {
    auto it = findName(converters_, typeName);
    return it == converters_.end() ? nullptr : it->second;
}

std::vector<VxString> VxXmlParserContext::typeConverterNames() const { return namesOf(converters_); }

void VxXmlParserContext::setErrorHandler(std::unique_ptr<ErrorHandler> handler) {
    errorHandler_ = handler ? std::move(handler) : std::unique_ptr<ErrorHandler>(new ErrorHandler);
}

#pragma once
// XML loading on TinyXML and namespace-aware element names ("wms.Layer", "xlink.href").
#include <map>
#include <string>
#include <tinyxml.h>

#include "vx/string.h"

class VxXmlUtilities {
public:
    // Documents nested deeper than this are refused before parsing (the parser recurses).
    static constexpr int kMaxDepth = 1024;

    // Parses text into doc. On failure returns false and sets error to the parser's text
    // with line and column. Declared ISO-8859-1 text is converted to UTF-8 first; a DOCTYPE
    // (with or without internal subset) is blanked since no DTD is ever read.
    static bool loadXmlFromString(const std::string& text, TiXmlDocument& doc, VxString& error);

    // Replaces a DOCTYPE declaration by spaces, keeping the length; false when it has no end.
    static bool blankDoctype(std::string& text);

    class NamespaceStack;
    class NamespaceStackEntry;
};

// Maps namespace URIs to fixed prefixes so names compare as "prefix.localName" whatever
// prefix a document happens to use. Prefix bindings are resolved through the xmlns
// declarations of the element and its ancestors.
class VxXmlUtilities::NamespaceStack {
public:
    void registerPrefix(const std::string& uri, const std::string& prefix) { prefixes_[uri] = prefix; }
    // Prefix for elements in no namespace (documents that declare none).
    void setDefaultPrefix(const std::string& prefix) { defaultPrefix_ = prefix; }
    const std::string& defaultPrefix() const { return defaultPrefix_; }

    void push(const TiXmlElement* e) { ++depth_; (void)e; }
    void pop() { if (depth_ > 0) --depth_; }

    // "prefix.local" for a registered namespace; the name as written for others; the
    // default prefix (if any) for elements in no namespace.
    std::string elementName(const TiXmlElement* e) const;
    // Attribute value by fixed name ("xlink.href", or a bare name); null when absent.
    const char* findAttribute(const TiXmlElement* e, const std::string& name) const;
    // First child element whose elementName equals name.
    const TiXmlElement* findChild(const TiXmlElement* e, const std::string& name) const;

    // Namespace URI bound to prefix at e ("" for the default namespace); null when unbound.
    static const char* resolvePrefix(const TiXmlElement* e, const std::string& prefix);

private:
    std::string fixedName(const TiXmlElement* scope, const std::string& qname, bool isAttribute) const;
    std::map<std::string, std::string> prefixes_;
    std::string defaultPrefix_;
    int depth_ = 0;
};

// Keeps an element pushed for the scope of a walk.
class VxXmlUtilities::NamespaceStackEntry {
public:
    NamespaceStackEntry(NamespaceStack& s, const TiXmlElement* e) : s_(s) { s_.push(e); }
    ~NamespaceStackEntry() { s_.pop(); }
    NamespaceStackEntry(const NamespaceStackEntry&) = delete;
    NamespaceStackEntry& operator=(const NamespaceStackEntry&) = delete;
private:
    NamespaceStack& s_;
};

using NamespaceStack = VxXmlUtilities::NamespaceStack;
using NamespaceStackEntry = VxXmlUtilities::NamespaceStackEntry;

// Text of an element as UTF-8; empty when it has none.
inline VxString vxElementText(const TiXmlElement* e) {
    const char* t = e ? e->GetText() : nullptr;
    return t ? VxString(t) : VxString();
}

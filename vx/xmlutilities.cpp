#include "vx/xmlutilities.h"

#include <cstring>

namespace {

// Rough nesting depth by tags; enough to stop a recursive parser from running out of stack.
int maxNestingDepth(const std::string& s) {
    int depth = 0, maxDepth = 0;
    const size_t n = s.size();
    for (size_t i = 0; i + 1 < n; ++i) {
        if (s[i] != '<') continue;
        char c = s[i + 1];
        if (c == '/') { --depth; continue; }
        if (c == '!' || c == '?') continue;
        // Find the end of this tag to learn whether it closes itself.
        size_t j = i + 1;
        char quote = 0;
        for (; j < n; ++j) {
            char d = s[j];
            if (quote) { if (d == quote) quote = 0; }
            else if (d == '"' || d == '\'') quote = d;
            else if (d == '>') break;
        }
        if (j < n && s[j - 1] == '/') { i = j; continue; }
        ++depth;
        if (depth > maxDepth) maxDepth = depth;
        i = j < n ? j : n;
    }
    return maxDepth;
}

bool declaredLatin1(const std::string& s) {
    size_t end = s.find("?>");
    if (s.compare(0, 5, "<?xml") != 0 || end == std::string::npos) {
        // Tolerate leading white space before the declaration.
        size_t p = s.find_first_not_of(" \t\r\n");
        if (p == std::string::npos || s.compare(p, 5, "<?xml") != 0) return false;
        end = s.find("?>", p);
        if (end == std::string::npos) return false;
    }
    std::string decl = s.substr(0, end);
    for (auto& c : decl) c = static_cast<char>(std::tolower(static_cast<unsigned char>(c)));
    return decl.find("iso-8859-1") != std::string::npos || decl.find("latin1") != std::string::npos ||
           decl.find("windows-1252") != std::string::npos;
}

}  // namespace

bool VxXmlUtilities::blankDoctype(std::string& text) {
    size_t start = text.find("<!DOCTYPE");
    if (start == std::string::npos) return true;
    // Only a DOCTYPE in the prolog counts: before the first element.
    for (size_t p = text.find('<'); p != std::string::npos && p < start; p = text.find('<', p + 1)) {
        char c = p + 1 < text.size() ? text[p + 1] : 0;
        if (c != '?' && c != '!') return true;
    }
    size_t i = start + 9;
    int bracket = 0;
    char quote = 0;
    for (; i < text.size(); ++i) {
        char c = text[i];
        if (quote) { if (c == quote) quote = 0; continue; }
        if (c == '"' || c == '\'') quote = c;
        else if (c == '[') ++bracket;
        else if (c == ']') --bracket;
        else if (c == '>' && bracket <= 0) break;
    }
    if (i >= text.size()) return false;
    std::memset(&text[start], ' ', i - start + 1);
    return true;
}

bool VxXmlUtilities::loadXmlFromString(const std::string& input, TiXmlDocument& doc, VxString& error) {
    std::string text = input;
    // A UTF-8 byte-order mark is harmless; anything before the first '<' that is not
    // white space (a stray BOM of another encoding) is dropped.
    size_t lt = text.find('<');
    if (lt == std::string::npos) {
        error = "Error document empty.";
        return false;
    }
    if (lt > 0) text.erase(0, lt);
    if (declaredLatin1(text)) text = VxString::fromLatin1(text).str();
    if (!blankDoctype(text)) {
        error = "Error parsing DOCTYPE declaration: no end.";
        return false;
    }
    if (maxNestingDepth(text) > kMaxDepth) {
        error = "Error document nested too deeply.";
        return false;
    }
    doc.Clear();
    doc.Parse(text.c_str(), nullptr, TIXML_ENCODING_UTF8);
    if (doc.Error()) {
        error = VxString(std::string(doc.ErrorDesc()) + " (line " + std::to_string(doc.ErrorRow()) +
                         ", column " + std::to_string(doc.ErrorCol()) + ")");
        return false;
    }
    if (!doc.RootElement()) {
        error = "Error document has no root element.";
        return false;
    }
    return true;
}

const char* VxXmlUtilities::NamespaceStack::resolvePrefix(const TiXmlElement* e, const std::string& prefix) {
    const std::string attr = prefix.empty() ? std::string("xmlns") : "xmlns:" + prefix;
    for (const TiXmlNode* n = e; n; n = n->Parent()) {
        const TiXmlElement* el = n->ToElement();
        if (!el) break;
        if (const char* v = el->Attribute(attr.c_str())) return v;
    }
    if (prefix == "xml") return "http://www.w3.org/XML/1998/namespace";
    return nullptr;
}

std::string VxXmlUtilities::NamespaceStack::fixedName(const TiXmlElement* scope, const std::string& qname,
                                                      bool isAttribute) const {
    size_t colon = qname.find(':');
    std::string prefix = colon == std::string::npos ? std::string() : qname.substr(0, colon);
    std::string local = colon == std::string::npos ? qname : qname.substr(colon + 1);
    // Unprefixed attributes are in no namespace.
    const char* uri = (isAttribute && prefix.empty()) ? nullptr : resolvePrefix(scope, prefix);
    if (uri && *uri) {
        auto it = prefixes_.find(uri);
        if (it != prefixes_.end()) return it->second + "." + local;
        return qname;
    }
    if (!isAttribute && prefix.empty() && !defaultPrefix_.empty()) return defaultPrefix_ + "." + local;
    return qname;
}

std::string VxXmlUtilities::NamespaceStack::elementName(const TiXmlElement* e) const {
    return e ? fixedName(e, e->ValueStr(), false) : std::string();
}

const char* VxXmlUtilities::NamespaceStack::findAttribute(const TiXmlElement* e, const std::string& name) const {
    if (!e) return nullptr;
    for (const TiXmlAttribute* a = e->FirstAttribute(); a; a = a->Next()) {
        const std::string qn = a->Name();
        if (qn.compare(0, 5, "xmlns") == 0 && (qn.size() == 5 || qn[5] == ':')) continue;
        if (fixedName(e, qn, true) == name) return a->Value();
    }
    return nullptr;
}

const TiXmlElement* VxXmlUtilities::NamespaceStack::findChild(const TiXmlElement* e, const std::string& name) const {
    if (!e) return nullptr;
    for (const TiXmlElement* c = e->FirstChildElement(); c; c = c->NextSiblingElement())
        if (elementName(c) == name) return c;
    return nullptr;
}

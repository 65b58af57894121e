#pragma once
// WMS GetCapabilities: version negotiation, the exchange, and the document walk.
#include "ogc/ogcwmscapabilities.h"
#include "vx/xmlutilities.h"

// Layers whose keyword list holds this identifier start disabled.
extern const char* const kVxOgcInitiallyOffKeyword;

class VxOgcWmsService {
public:
    // Tries the unversioned request, then 1.3.0, then 1.1.1; null when none succeeded.
    // Never throws a VxException.
    static VxRef<VxOgcWmsCapabilities> negotiateCapabilities(const VxString& url, int timeout,
                                                             const VxString& user, const VxString& password);
    // One exchange with the complete request URL: the record, null, or an exception.
    static VxRef<VxOgcWmsCapabilities> getCapabilities(const VxString& url, int timeout, const VxString& user,
                                                       const VxString& password);
    // Reads a capabilities document already in memory (what getCapabilities does after
    // the exchange); url only names the source in messages.
    static VxRef<VxOgcWmsCapabilities> parseCapabilities(const std::string& body, const VxString& url);

private:
    static void parseDocument(NamespaceStack& ns, const TiXmlElement* root, VxOgcWmsCapabilities& caps);
};

// Removes pasted GetCapabilities parameters and leaves the URL ready for more.
VxString normalizeServiceUrl(const VxString& url);

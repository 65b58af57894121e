#pragma once
// WCS 1.1.1: GetCapabilities and, right after it, DescribeCoverage for the coverages the
// caller names; both answers go into one VxWcsCapabilities record.
#include <string>

#include "ogc/wcscapabilities.h"

class VxWcsService {
public:
    VxWcsService() = delete;

    // Builds the GetCapabilities request from the base URL. Null when anything failed;
    // never throws a VxException.
    static VxRef<VxWcsCapabilities> negotiateCapabilities(const VxString& url, const VxString& identifiers,
                                                          int timeout, const VxString& user,
                                                          const VxString& password);
    // url is the complete GetCapabilities request. Null for a failed transfer, a body that
    // is not XML or another root element; throws VxXWcsVersionNotSupported and the
    // DescribeCoverage errors.
    static VxRef<VxWcsCapabilities> getCapabilities(const VxString& url, const VxString& identifiers, int timeout,
                                                    const VxString& user, const VxString& password);
    // Sends DescribeCoverage (without credentials) and adds its answer to the record.
    static void getCoverage(const VxRef<VxWcsCapabilities>& capabilities, const VxString& version,
                            const VxString& identifiers, int timeout);

    // The document walks on bodies already in memory. parseCapabilities does not send
    // DescribeCoverage; it returns null or throws as getCapabilities does.
    static VxRef<VxWcsCapabilities> parseCapabilities(const std::string& body);
    // url only names the request in the exceptions.
    static void parseCoverageDescriptions(VxWcsCapabilities& capabilities, const std::string& body,
                                          const VxString& url);
};

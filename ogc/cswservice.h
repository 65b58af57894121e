#pragma once
// A CSW 2.0.2 catalogue: its capabilities, and pages of ISO 19139 service records. No
// request carries credentials.
#include <string>
#include <tinyxml.h>

#include "ogc/cswcapabilities.h"

class VxCswService {
public:
    // The GetRecords constraint: Dublin Core type "service", as plain XML and as the
    // percent-encoded form a GET request carries.
    static const char* const kPlainConstraint;
    static const char* const kEncodedConstraint;
    static constexpr int kPageSize = 25;

    // url is the complete GetCapabilities request. Null when the transfer fails or the root
    // element is not a CSW Capabilities; throws VxXGetCapabilitiesXmlError and
    // VxXCswVersionNotSupported.
    static VxRef<VxCswCapabilities> getCapabilities(const VxString& url, int timeout);
    // The walk on a body already in memory (what getCapabilities does after the exchange).
    static VxRef<VxCswCapabilities> parseCapabilities(const std::string& body);

    // One page of records from the one-based startPosition into document. With GET the
    // parameters follow url directly (it must end in "?" or "&"); with POST they are the
    // body. True when the page arrived and parsed without error.
    static bool getRecords(const VxString& url, TiXmlDocument& document, int startPosition, bool post, int timeout);
    // The GetRecords parameters, with the encoded (GET) or plain (POST) constraint.
    static std::string recordsParameters(int startPosition, bool encoded);

    VxCswService& operator=(const VxCswService&) = default;
};

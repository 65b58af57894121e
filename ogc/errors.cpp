#include "ogc/errors.h"

VxXIllegalValue::VxXIllegalValue(const char* file, int line, const VxString& a1, const VxString& a2)
    : VxException(file, line, a1, a2) {
    logException();
}
VxXIllegalValue::~VxXIllegalValue() = default;
const char* VxXIllegalValue::errorId() const { return "IllegalValue"; }
const char* VxXIllegalValue::messageTemplate() const { return "Value \"$1\" is illegal in $2"; }

VxXXmlTypeConversionFailed::VxXXmlTypeConversionFailed(const char* file, int line)
    : VxException(file, line) {
    logException();
}
VxXXmlTypeConversionFailed::~VxXXmlTypeConversionFailed() = default;
const char* VxXXmlTypeConversionFailed::errorId() const { return "XmlTypeConversionFailed"; }
const char* VxXXmlTypeConversionFailed::messageTemplate() const { return "Type conversion failed"; }

VxXXmlRequiredValueMissing::VxXXmlRequiredValueMissing(const char* file, int line)
    : VxException(file, line) {
    logException();
}
VxXXmlRequiredValueMissing::~VxXXmlRequiredValueMissing() = default;
const char* VxXXmlRequiredValueMissing::errorId() const { return "XmlRequiredValueMissing"; }
const char* VxXXmlRequiredValueMissing::messageTemplate() const { return "RequiredValueMissing"; }

VxXPropertyFrozen::VxXPropertyFrozen(const char* file, int line, const VxString& a1)
    : VxException(file, line, a1) {
    logException();
}
VxXPropertyFrozen::~VxXPropertyFrozen() = default;
const char* VxXPropertyFrozen::errorId() const { return "PropertyFrozen"; }
const char* VxXPropertyFrozen::messageTemplate() const { return "The property \"$1\" can not be changed after the object has been initialized."; }

VxXPropertyReadOnly::VxXPropertyReadOnly(const char* file, int line, const VxString& a1)
    : VxException(file, line, a1) {
    logException();
}
VxXPropertyReadOnly::~VxXPropertyReadOnly() = default;
const char* VxXPropertyReadOnly::errorId() const { return "PropertyReadOnly"; }
const char* VxXPropertyReadOnly::messageTemplate() const { return "The property \"$1\" is read-only in this class."; }

VxXNotSupported::VxXNotSupported(const char* file, int line, const VxString& a1)
    : VxException(file, line, a1) {
    logException();
}
VxXNotSupported::~VxXNotSupported() = default;
const char* VxXNotSupported::errorId() const { return "NotSupported"; }
const char* VxXNotSupported::messageTemplate() const { return "$1 is not supported."; }

VxXGetCapabilitiesXmlError::VxXGetCapabilitiesXmlError(const char* file, int line, const VxString& a1, const VxString& a2)
    : VxException(file, line, a1, a2) {
    logException();
}
VxXGetCapabilitiesXmlError::~VxXGetCapabilitiesXmlError() = default;
const char* VxXGetCapabilitiesXmlError::errorId() const { return "GetCapabilitiesXmlError"; }
const char* VxXGetCapabilitiesXmlError::messageTemplate() const { return "Error parsing GetCapabilites response, line $1: $2"; }

VxXWmsGetCapabilitiesXmlError::VxXWmsGetCapabilitiesXmlError(const char* file, int line, const VxString& a1)
    : VxException(file, line, a1) {
    logException();
}
VxXWmsGetCapabilitiesXmlError::~VxXWmsGetCapabilitiesXmlError() = default;
const char* VxXWmsGetCapabilitiesXmlError::errorId() const { return "GetCapabilitiesXmlError"; }
const char* VxXWmsGetCapabilitiesXmlError::messageTemplate() const { return "Error parsing WMS GetCapabilites response: $1"; }

VxXCswVersionNotSupported::VxXCswVersionNotSupported(const char* file, int line, const VxString& a1)
    : VxException(file, line, a1) {
    logException();
}
VxXCswVersionNotSupported::~VxXCswVersionNotSupported() = default;
const char* VxXCswVersionNotSupported::errorId() const { return "CswVersionNotSupported"; }
const char* VxXCswVersionNotSupported::messageTemplate() const { return "CS/W version $1 is not supported"; }

VxXRequestError::VxXRequestError(const char* file, int line, const VxString& a1, const VxString& a2)
    : VxException(file, line, a1, a2) {
    logException();
}
VxXRequestError::~VxXRequestError() = default;
const char* VxXRequestError::errorId() const { return "RequestError"; }
const char* VxXRequestError::messageTemplate() const { return "Request '$1' to server '$2' failed."; }

VxXOgcError::VxXOgcError(const char* file, int line, const VxString& a1)
    : VxException(file, line, a1) {
    logException();
}
VxXOgcError::~VxXOgcError() = default;
const char* VxXOgcError::errorId() const { return "OgcError"; }
const char* VxXOgcError::messageTemplate() const { return "$1"; }

VxXGenericException::VxXGenericException(const char* file, int line, const VxString& a1)
    : VxException(file, line, a1) {
    logException();
}
VxXGenericException::~VxXGenericException() = default;
const char* VxXGenericException::errorId() const { return "GenericException"; }
const char* VxXGenericException::messageTemplate() const { return "$1"; }

VxXOgcWcsError::VxXOgcWcsError(const char* file, int line, const VxString& a1)
    : VxException(file, line, a1) {
    logException();
}
VxXOgcWcsError::~VxXOgcWcsError() = default;
const char* VxXOgcWcsError::errorId() const { return "OgcWcsError"; }
const char* VxXOgcWcsError::messageTemplate() const { return "$1"; }

VxXInvalidUrl::VxXInvalidUrl(const char* file, int line, const VxString& a1)
    : VxException(file, line, a1) {
    logException();
}
VxXInvalidUrl::~VxXInvalidUrl() = default;
const char* VxXInvalidUrl::errorId() const { return "InvalidUrl"; }
const char* VxXInvalidUrl::messageTemplate() const { return "Invalid URL: $1"; }

VxXServiceNegotiationFailed::VxXServiceNegotiationFailed(const char* file, int line, const VxString& a1)
    : VxException(file, line, a1) {
    logException();
}
VxXServiceNegotiationFailed::~VxXServiceNegotiationFailed() = default;
const char* VxXServiceNegotiationFailed::errorId() const { return "ServiceNegotiationFailed"; }
const char* VxXServiceNegotiationFailed::messageTemplate() const { return "Failed to negotiate capabilities with service at: $1"; }

VxXOgcWmsError::VxXOgcWmsError(const char* file, int line, const VxString& a1)
    : VxException(file, line, a1) {
    logException();
}
VxXOgcWmsError::~VxXOgcWmsError() = default;
const char* VxXOgcWmsError::errorId() const { return "OgcWmsError"; }
const char* VxXOgcWmsError::messageTemplate() const { return "$1"; }

VxXSharingViolation::VxXSharingViolation(const char* file, int line, const VxString& a1)
    : VxException(file, line, a1) {
    logException();
}
VxXSharingViolation::~VxXSharingViolation() = default;
const char* VxXSharingViolation::errorId() const { return "SharingViolation"; }
const char* VxXSharingViolation::messageTemplate() const { return "The $1 is owned by another object."; }

VxXNullValue::VxXNullValue(const char* file, int line, const VxString& a1, const VxString& a2)
    : VxException(file, line, a1, a2) {
    logException();
}
VxXNullValue::~VxXNullValue() = default;
const char* VxXNullValue::errorId() const { return "NullValue"; }
const char* VxXNullValue::messageTemplate() const { return "Value \"$1\" is null in $2."; }

VxXWmtsServiceNegotiationFailed::VxXWmtsServiceNegotiationFailed(const char* file, int line, const VxString& a1, const VxString& a2)
    : VxException(file, line, a1, a2) {
    logException();
}
VxXWmtsServiceNegotiationFailed::~VxXWmtsServiceNegotiationFailed() = default;
const char* VxXWmtsServiceNegotiationFailed::errorId() const { return "WmtsServiceNegotiationFailed"; }
const char* VxXWmtsServiceNegotiationFailed::messageTemplate() const { return "$1: Failed to negotiate capabilities with WMTS service at: $2"; }

VxXOgcWmtsError::VxXOgcWmtsError(const char* file, int line, const VxString& a1, const VxString& a2)
    : VxException(file, line, a1, a2) {
    logException();
}
VxXOgcWmtsError::~VxXOgcWmtsError() = default;
const char* VxXOgcWmtsError::errorId() const { return "OgcWmtsError"; }
const char* VxXOgcWmtsError::messageTemplate() const { return "$1: $2"; }

VxXReadOnly::VxXReadOnly(const char* file, int line, const VxString& a1)
    : VxException(file, line, a1) {
    logException();
}
VxXReadOnly::~VxXReadOnly() = default;
const char* VxXReadOnly::errorId() const { return "ReadOnly"; }
const char* VxXReadOnly::messageTemplate() const { return "The $1 is read-only."; }

VxXDescribeCoverageResponseUnrecognized::VxXDescribeCoverageResponseUnrecognized(const char* file, int line, const VxString& a1)
    : VxException(file, line, a1) {
    logException();
}
VxXDescribeCoverageResponseUnrecognized::~VxXDescribeCoverageResponseUnrecognized() = default;
const char* VxXDescribeCoverageResponseUnrecognized::errorId() const { return "DescribeCoverageResponseUnrecognized"; }
const char* VxXDescribeCoverageResponseUnrecognized::messageTemplate() const { return "Did not recognize describe coverage response ('$1')."; }

VxXDescribeCoverageFailed::VxXDescribeCoverageFailed(const char* file, int line, const VxString& a1)
    : VxException(file, line, a1) {
    logException();
}
VxXDescribeCoverageFailed::~VxXDescribeCoverageFailed() = default;
const char* VxXDescribeCoverageFailed::errorId() const { return "DescribeCoverageFailed"; }
const char* VxXDescribeCoverageFailed::messageTemplate() const { return "Describe coverage request failed ('$1')."; }

VxXWcsVersionNotSupported::VxXWcsVersionNotSupported(const char* file, int line, const VxString& a1)
    : VxException(file, line, a1) {
    logException();
}
VxXWcsVersionNotSupported::~VxXWcsVersionNotSupported() = default;
const char* VxXWcsVersionNotSupported::errorId() const { return "WcsVersionNotSupported"; }
const char* VxXWcsVersionNotSupported::messageTemplate() const { return "WCS version $1 is not supported."; }

VxXWmsVersionNotSupported::VxXWmsVersionNotSupported(const char* file, int line, const VxString& a1)
    : VxException(file, line, a1) {
    logException();
}
VxXWmsVersionNotSupported::~VxXWmsVersionNotSupported() = default;
const char* VxXWmsVersionNotSupported::errorId() const { return "WmsVersionNotSupported"; }
const char* VxXWmsVersionNotSupported::messageTemplate() const { return "WMS service version $1 is not supported"; }

VxXWmsServiceException::VxXWmsServiceException(const char* file, int line, const VxString& a1)
    : VxException(file, line, a1) {
    logException();
}
VxXWmsServiceException::~VxXWmsServiceException() = default;
const char* VxXWmsServiceException::errorId() const { return "WmsServiceException"; }
const char* VxXWmsServiceException::messageTemplate() const { return "$1"; }

#pragma once
// The module's error classes: each adds only its identifier and message template,
// and writes itself to the log when constructed.
#include "vx/exception.h"

class VxXIllegalValue : public VxException {
public:
    VxXIllegalValue(const char* file, int line, const VxString& a1, const VxString& a2);
    VxXIllegalValue(const VxXIllegalValue&) = default;
    ~VxXIllegalValue() override;
    const char* errorId() const override;
    const char* messageTemplate() const override;
};

class VxXXmlTypeConversionFailed : public VxException {
public:
    VxXXmlTypeConversionFailed(const char* file, int line);
    VxXXmlTypeConversionFailed(const VxXXmlTypeConversionFailed&) = default;
    ~VxXXmlTypeConversionFailed() override;
    const char* errorId() const override;
    const char* messageTemplate() const override;
};

class VxXXmlRequiredValueMissing : public VxException {
public:
    VxXXmlRequiredValueMissing(const char* file, int line);
    VxXXmlRequiredValueMissing(const VxXXmlRequiredValueMissing&) = default;
    ~VxXXmlRequiredValueMissing() override;
    const char* errorId() const override;
    const char* messageTemplate() const override;
};

class VxXPropertyFrozen : public VxException {
public:
    VxXPropertyFrozen(const char* file, int line, const VxString& a1);
    VxXPropertyFrozen(const VxXPropertyFrozen&) = default;
    ~VxXPropertyFrozen() override;
    const char* errorId() const override;
    const char* messageTemplate() const override;
};

class VxXPropertyReadOnly : public VxException {
public:
    VxXPropertyReadOnly(const char* file, int line, const VxString& a1);
    VxXPropertyReadOnly(const VxXPropertyReadOnly&) = default;
    ~VxXPropertyReadOnly() override;
    const char* errorId() const override;
    const char* messageTemplate() const override;
};

class VxXNotSupported : public VxException {
public:
    VxXNotSupported(const char* file, int line, const VxString& a1);
    VxXNotSupported(const VxXNotSupported&) = default;
    ~VxXNotSupported() override;
    const char* errorId() const override;
    const char* messageTemplate() const override;
};

class VxXGetCapabilitiesXmlError : public VxException {
public:
    VxXGetCapabilitiesXmlError(const char* file, int line, const VxString& a1, const VxString& a2);
    VxXGetCapabilitiesXmlError(const VxXGetCapabilitiesXmlError&) = default;
    ~VxXGetCapabilitiesXmlError() override;
    const char* errorId() const override;
    const char* messageTemplate() const override;
};

class VxXWmsGetCapabilitiesXmlError : public VxException {
public:
    VxXWmsGetCapabilitiesXmlError(const char* file, int line, const VxString& a1);
    VxXWmsGetCapabilitiesXmlError(const VxXWmsGetCapabilitiesXmlError&) = default;
    ~VxXWmsGetCapabilitiesXmlError() override;
    const char* errorId() const override;
    const char* messageTemplate() const override;
};

class VxXCswVersionNotSupported : public VxException {
public:
    VxXCswVersionNotSupported(const char* file, int line, const VxString& a1);
    VxXCswVersionNotSupported(const VxXCswVersionNotSupported&) = default;
    ~VxXCswVersionNotSupported() override;
    const char* errorId() const override;
    const char* messageTemplate() const override;
};

class VxXRequestError : public VxException {
public:
    VxXRequestError(const char* file, int line, const VxString& a1, const VxString& a2);
    VxXRequestError(const VxXRequestError&) = default;
    ~VxXRequestError() override;
    const char* errorId() const override;
    const char* messageTemplate() const override;
};

class VxXOgcError : public VxException {
public:
    VxXOgcError(const char* file, int line, const VxString& a1);
    VxXOgcError(const VxXOgcError&) = default;
    ~VxXOgcError() override;
    const char* errorId() const override;
    const char* messageTemplate() const override;
};

class VxXGenericException : public VxException {
public:
    VxXGenericException(const char* file, int line, const VxString& a1);
    VxXGenericException(const VxXGenericException&) = default;
    ~VxXGenericException() override;
    const char* errorId() const override;
    const char* messageTemplate() const override;
};

class VxXOgcWcsError : public VxException {
public:
    VxXOgcWcsError(const char* file, int line, const VxString& a1);
    VxXOgcWcsError(const VxXOgcWcsError&) = default;
    ~VxXOgcWcsError() override;
    const char* errorId() const override;
    const char* messageTemplate() const override;
};

class VxXInvalidUrl : public VxException {
public:
    VxXInvalidUrl(const char* file, int line, const VxString& a1);
    VxXInvalidUrl(const VxXInvalidUrl&) = default;
    ~VxXInvalidUrl() override;
    const char* errorId() const override;
    const char* messageTemplate() const override;
};

class VxXServiceNegotiationFailed : public VxException {
public:
    VxXServiceNegotiationFailed(const char* file, int line, const VxString& a1);
    VxXServiceNegotiationFailed(const VxXServiceNegotiationFailed&) = default;
    ~VxXServiceNegotiationFailed() override;
    const char* errorId() const override;
    const char* messageTemplate() const override;
};

class VxXOgcWmsError : public VxException {
public:
    VxXOgcWmsError(const char* file, int line, const VxString& a1);
    VxXOgcWmsError(const VxXOgcWmsError&) = default;
    ~VxXOgcWmsError() override;
    const char* errorId() const override;
    const char* messageTemplate() const override;
};

class VxXSharingViolation : public VxException {
public:
    VxXSharingViolation(const char* file, int line, const VxString& a1);
    VxXSharingViolation(const VxXSharingViolation&) = default;
    ~VxXSharingViolation() override;
    const char* errorId() const override;
    const char* messageTemplate() const override;
};

class VxXNullValue : public VxException {
public:
    VxXNullValue(const char* file, int line, const VxString& a1, const VxString& a2);
    VxXNullValue(const VxXNullValue&) = default;
    ~VxXNullValue() override;
    const char* errorId() const override;
    const char* messageTemplate() const override;
};

class VxXWmtsServiceNegotiationFailed : public VxException {
public:
    VxXWmtsServiceNegotiationFailed(const char* file, int line, const VxString& a1, const VxString& a2);
    VxXWmtsServiceNegotiationFailed(const VxXWmtsServiceNegotiationFailed&) = default;
    ~VxXWmtsServiceNegotiationFailed() override;
    const char* errorId() const override;
    const char* messageTemplate() const override;
};

class VxXOgcWmtsError : public VxException {
public:
    VxXOgcWmtsError(const char* file, int line, const VxString& a1, const VxString& a2);
    VxXOgcWmtsError(const VxXOgcWmtsError&) = default;
    ~VxXOgcWmtsError() override;
    const char* errorId() const override;
    const char* messageTemplate() const override;
};

class VxXReadOnly : public VxException {
public:
    VxXReadOnly(const char* file, int line, const VxString& a1);
    VxXReadOnly(const VxXReadOnly&) = default;
    ~VxXReadOnly() override;
    const char* errorId() const override;
    const char* messageTemplate() const override;
};

class VxXDescribeCoverageResponseUnrecognized : public VxException {
public:
    VxXDescribeCoverageResponseUnrecognized(const char* file, int line, const VxString& a1);
    VxXDescribeCoverageResponseUnrecognized(const VxXDescribeCoverageResponseUnrecognized&) = default;
    ~VxXDescribeCoverageResponseUnrecognized() override;
    const char* errorId() const override;
    const char* messageTemplate() const override;
};

class VxXDescribeCoverageFailed : public VxException {
public:
    VxXDescribeCoverageFailed(const char* file, int line, const VxString& a1);
    VxXDescribeCoverageFailed(const VxXDescribeCoverageFailed&) = default;
    ~VxXDescribeCoverageFailed() override;
    const char* errorId() const override;
    const char* messageTemplate() const override;
};

class VxXWcsVersionNotSupported : public VxException {
public:
    VxXWcsVersionNotSupported(const char* file, int line, const VxString& a1);
    VxXWcsVersionNotSupported(const VxXWcsVersionNotSupported&) = default;
    ~VxXWcsVersionNotSupported() override;
    const char* errorId() const override;
    const char* messageTemplate() const override;
};

class VxXWmsVersionNotSupported : public VxException {
public:
    VxXWmsVersionNotSupported(const char* file, int line, const VxString& a1);
    VxXWmsVersionNotSupported(const VxXWmsVersionNotSupported&) = default;
    ~VxXWmsVersionNotSupported() override;
    const char* errorId() const override;
    const char* messageTemplate() const override;
};

class VxXWmsServiceException : public VxException {
public:
    VxXWmsServiceException(const char* file, int line, const VxString& a1);
    VxXWmsServiceException(const VxXWmsServiceException&) = default;
    ~VxXWmsServiceException() override;
    const char* errorId() const override;
    const char* messageTemplate() const override;
};

#include "ogc/ogcwcsdataset.h"

#include <algorithm>
#include <istream>

#include "ogc/MemInput.h"
#include "ogc/errors.h"
#include "ogc/http.h"
#include "ogc/ogcservice.h"
#include "ogc/wcsservice.h"
#include "vx/imagehandler.h"
#include "vx/log.h"
#include "vx/runtime.h"
#include "vx/stringutils.h"

VX_IMPLEMENT_CLASS(VxOgcWcsDataSet, VxDataSet, 11)

namespace {

using Guard = std::lock_guard<std::recursive_mutex>;

// Where the TIFF image starts inside a text-flagged answer (a multipart body or an XML
// envelope), or npos. The earlier of the two byte orders wins, so that bytes inside one
// image are never taken for the start of another.
size_t findTiffHeader(const std::string& data) {
    static const std::string little("II*\0", 4);
    static const std::string big("MM\0*", 4);
    return std::min(data.find(little), data.find(big));
}

// The MIME type without parameters, so "image/tiff; x=y" is still TIFF.
bool isTiffContentType(const std::string& contentType) {
    const VxString type = VxString(contentType.substr(0, contentType.find(';'))).trimmed();
    return VxStringUtils::isEqualIgnoreCase(type, "image/tiff") ||
           VxStringUtils::isEqualIgnoreCase(type, "image/geotiff") || VxStringUtils::isEqualIgnoreCase(type, "tiff");
}

// The text of an exception answer worth logging.
std::string exceptionDetail(const std::string& data) {
    static const std::string open = "<ExceptionText>";
    static const std::string close = "</ExceptionText>";
    const size_t at = data.find(open);
    if (at == std::string::npos) return data;
    const size_t from = at + open.size();
    const size_t end = data.find(close);
    if (end == std::string::npos) return data.substr(from);
    if (end < from) return std::string();
    return data.substr(from, end - from);
}

}  // namespace

VxOgcWcsDataSet::VxOgcWcsDataSet(const VxString& url, const VxString& coverageId)
    : VxDataSet(VxCrs::wgs84LongLat(), false), url_(url), coverageId_(coverageId) {}

VxOgcWcsDataSet::VxOgcWcsDataSet(const VxOgcWcsDataSetParams& p)
    : VxDataSet(p, false), url_(p.getUrl()), coverageId_(p.getCoverageId()), version_(p.getVersion()),
      user_(p.getUser()), password_(p.getPassword()), timeout_(p.getTimeout()),
      throwExceptions_(p.getThrowExceptions()) {}

VxOgcWcsDataSet::VxOgcWcsDataSet(const VxOgcWcsDataSet& o)
    : VxDataSet(o), user_(o.user_), password_(o.password_), timeout_(o.timeout_),
      throwExceptions_(o.throwExceptions_) {
    Guard g(o.mutex());
    url_ = o.url_;
    coverageId_ = o.coverageId_;
    version_ = o.version_;
    getCoverageUrl_ = o.getCoverageUrl_;
    imageFormat_ = o.imageFormat_;
    crsString_ = o.crsString_;
    bounds_ = o.bounds_;
}

VxOgcWcsDataSet::~VxOgcWcsDataSet() = default;

VxRef<VxEngineObject> VxOgcWcsDataSet::cloneWithMap(VxOperatorMap* map) const {
    VxRef<VxOgcWcsDataSet> copy(new VxOgcWcsDataSet(*this));
    if (map) map->put(this, copy.get());
    return copy;
}

VxString VxOgcWcsDataSet::url() const {
    Guard g(mutex());
    return url_;
}

VxString VxOgcWcsDataSet::coverageId() const {
    Guard g(mutex());
    return coverageId_;
}

VxString VxOgcWcsDataSet::version() const {
    Guard g(mutex());
    return version_;
}

void VxOgcWcsDataSet::url(const VxString& v) {
    Guard g(mutex());
    if (isInitialized()) throw VxXPropertyFrozen("ogcwcsdataset", __LINE__, "\"OgcWcsDataSet.Url\"");
    url_ = v;
}

void VxOgcWcsDataSet::coverageId(const VxString& v) {
    Guard g(mutex());
    if (isInitialized()) throw VxXPropertyFrozen("ogcwcsdataset", __LINE__, "\"OgcWcsDataSet.CoverageId\"");
    coverageId_ = v;
}

void VxOgcWcsDataSet::version(const VxString& v) {
    Guard g(mutex());
    if (isInitialized()) throw VxXPropertyFrozen("ogcwcsdataset", __LINE__, "\"OgcWcsDataSet.Version\"");
    version_ = v;
}

void VxOgcWcsDataSet::bounds(const VxRect&) {
    throw VxXPropertyReadOnly("ogcwcsdataset", __LINE__, "\"OgcWcsDataSet.Bounds\"");
}

VxString VxOgcWcsDataSet::imageFormat() const {
    Guard g(mutex());
    return imageFormat_;
}

VxString VxOgcWcsDataSet::crsString() const {
    Guard g(mutex());
    return crsString_;
}

VxString VxOgcWcsDataSet::getCoverageUrl() const {
    Guard g(mutex());
    return getCoverageUrl_;
}

void VxOgcWcsDataSet::reset() {
    Guard g(mutex());
    clearStateFlags();
    getCoverageUrl_ = VxString();
}

VxRect VxOgcWcsDataSet::doBounds() {
    Guard g(mutex());
    return bounds_;
}

void VxOgcWcsDataSet::handleError(const VxString& message) {
    if (throwExceptions_) throw VxXOgcWcsError("ogcwcsdataset", __LINE__, name() + ": " + message);
    VxRuntime::errorEvent().raise(this, VxErrorEventArgs{message});
    VxLog::logf(VxLog::Error, "%1% : %2%", name(), message);
}

bool VxOgcWcsDataSet::setImageFormat(const VxVec<VxString>& formats, const VxString& key) {
    for (const VxString& f : formats) {
        if (f.toLower().contains(key)) {
            imageFormat_ = f;
            break;
        }
    }
    return !imageFormat_.isEmpty();
}

VxString VxOgcWcsDataSet::getCrsString() {
    if (!crsString_.isEmpty()) return crsString_;
    const VxRef<VxCrs> c = crs();
    if (c) crsString_ = "urn:ogc:def:crs:" + c->authority().toUpper() + "::" + c->code();
    return crsString_;
}

void VxOgcWcsDataSet::doInitialize() {
    Guard g(mutex());
    VxLog::logf(VxLog::Info, "Requesting WCS capabilities with timeout %1% seconds, URL: %2%", timeout_, url_);
    VxRef<VxWcsCapabilities> caps =
        VxWcsService::negotiateCapabilities(url_, coverageId_, timeout_, user_, password_);
    if (!caps) {
        handleError("GetCapabilities failed ('" + url_ + "').");
        return;
    }
    VxLog::logf(VxLog::Debug, "Abstract: %1%", caps->abstract);

    bool found = false;
    for (size_t i = 0; i < caps->coverageIds->size(); ++i) {
        const VxString& id = (*caps->coverageIds)[i];
        VxLog::logf(VxLog::Debug, "Coverage id (%1%): %2%", i, id);
        if (id == coverageId_) found = true;
    }
    if (!found)
        VxLog::warning((name() + ": Coverage id '" + coverageId_ + "' does not exists in the WCS ('" + url_ + "').")
                           .str());

    for (size_t i = 0; i < caps->formats->size(); ++i)
        VxLog::logf(VxLog::Debug, "Format (%1%): %2%", i, (*caps->formats)[i]);

    // The coverage's own formats come first: the service-wide list may offer a TIFF
    // flavour that does not keep this coverage's sample type.
    bool chosen = false;
    for (const VxVec<VxString>* list : {caps->supportedFormats.get(), caps->formats.get()}) {
        if (list->empty()) continue;
        chosen = setImageFormat(*list, "image/tiff") || setImageFormat(*list, "image/geotiff") ||
                 setImageFormat(*list, "tiff");
        if (chosen) break;
    }
    if (!chosen) {
        VxLog::warning((name() + ": No suitable image format exists in the WCS ('" + url_ + "').").str());
        imageFormat_ = "image/tiff";
    }

    for (size_t i = 0; i < caps->epsgIds->size(); ++i)
        VxLog::logf(VxLog::Debug, "EPSG id (%1%): %2%", i, (*caps->epsgIds)[i]);
    size_t k = 0;
    for (const VxString& kw : caps->keywords) VxLog::logf(VxLog::Debug, "Keyword (%1%): %2%", k++, kw);

    VxLog::logf(VxLog::Debug, "Get describe coverage: %1%", caps->describeCoverageGetUrl);
    getCoverageUrl_ = caps->getCoverageGetUrl;
    VxLog::logf(VxLog::Debug, "Get get coverage: %1%", getCoverageUrl_);
    VxLog::logf(VxLog::Debug, "Post describe coverage: %1%", caps->describeCoveragePostUrl);
    VxLog::logf(VxLog::Debug, "Post get coverage: %1%", caps->getCoveragePostUrl);
    VxLog::logf(VxLog::Debug, "Title: %1%", caps->title);
    if (caps->version == 0) VxLog::debug("Version: WCS 1.1.1");

    if (!caps->crs) {
        handleError("Unable to get coordinate reference system from WCS ('" + url_ + "').");
        return;
    }

    crsString_ = "urn:ogc:def:crs:" + caps->crsAuthority + "::" + caps->crsCode;
    bool matched = false;
    for (size_t i = 0; i < caps->supportedCrs->size(); ++i) {
        const VxString& s = (*caps->supportedCrs)[i];
        VxLog::logf(VxLog::Debug, "CRS (%1%): %2%", i, s);
        if (VxStringUtils::isEqualIgnoreCase(s, crsString_)) {
            crsString_ = s;
            VxLog::logf(VxLog::Debug, "Using CRS: %1%", crsString_);
            matched = true;
        }
    }
    if (!matched) {
        handleError("No suitable coordinate reference system exists in the WCS ('" + url_ + "').");
        return;
    }

    crs(caps->crs);
    bounds_ = caps->bounds;
    VxLog::logf(VxLog::Debug, "Reversed axis order: %1%", VxOgcService::switchXY(caps->crs) ? "True" : "False");
    VxLog::logf(VxLog::Debug, "Bounds (%1%, %2%) (%3%, %4%)", bounds_.minx, bounds_.miny, bounds_.maxx, bounds_.maxy);
}

VxRef<VxQueryResult> VxOgcWcsDataSet::doQuery(const VxRef<VxLayerInfo>&, const VxRect& rect, VxRef<VxQuery>,
                                              const VxRef<VxVec<VxId>>&) {
    Guard g(mutex());
    VxString url = VxOgcService::readyForParameters(getCoverageUrl_);
    url += "service=WCS";
    url += "&version=" + version_;
    url += "&request=GetCoverage";
    url += "&identifier=" + coverageId_;
    url += "&format=" + imageFormat_;
    url += "&boundingbox=";
    const VxRef<VxCrs> system = crs();
    const bool swap = VxOgcService::switchXY(system);
    const double values[4] = {swap ? rect.miny : rect.minx, swap ? rect.minx : rect.miny,
                              swap ? rect.maxy : rect.maxx, swap ? rect.maxx : rect.maxy};
    for (int i = 0; i < 4; ++i) {
        if (i) url += ",";
        url += VxStringBuilder::fixed(values[i], 6);
    }
    url += "," + getCrsString();
    VxLog::logf(VxLog::Debug, "OgcWcsDataSet %1%: query = '%2%'", name(), url);

    VxHttpResponse response;
    if (!httpGet(url.toActiveCP(), response, timeout_, user_.toActiveCP(), password_.toActiveCP())) {
        handleError("Failed to get map image from WCS service.");
        return nullptr;
    }

    const std::string& data = response.data;
    size_t start = std::string::npos;
    if (response.xml == 1) start = findTiffHeader(data);
    else if (isTiffContentType(response.contentType)) start = 0;

    if (start != std::string::npos) {
        MemInput buffer(data.data() + start, data.data() + data.size());
        std::istream in(&buffer);
        VxRef<VxRasterGeometry> geometry = VxImageHandler::streamIn("tiff", nullptr, in);
        if (geometry) {
            geometry->bounds(rect);
            VxRef<VxFeature> feature(new VxFeature(geometry, system, VxId(), false));
            return VxRef<VxQueryResult>(new VxSingleResult(feature, nullptr));
        }
    } else {
        const std::string detail = exceptionDetail(data);
        if (!detail.empty())
            VxLog::logf(VxLog::Warning, "%1%: Response from server was:\n%2%", name(), detail);
    }
    handleError("Failed to get raster from WCS ('" + url + "')");
    return nullptr;
}

#include "ogc/http.h"

#include <curl/curl.h>

#include <atomic>
#include <chrono>
#include <cstdlib>
#include <cstring>
#include <mutex>

#include "vx/log.h"
#include "vx/string.h"

namespace {

using Clock = std::chrono::steady_clock;

const char* const kUserAgent = "Veltrano Engine OGC Reader";
const char* const kAcceptHeader =
    "Accept: image/*, application/vnd.ogc.wms_xml, application/vnd.ogc.se_xml, application/xml, text/xml";
const char* const kFormContentType = "Content-Type: application/x-www-form-urlencoded";
const long kMaxRedirects = 5;
const long kMaxPooledConnections = 32;
// Bodies of failed statuses are drained up to this size so the connection stays reusable.
const size_t kMaxDrainedBody = 64 * 1024;

std::atomic<bool> g_certificateFallback{false};

// Process-wide share handle: connections, DNS answers and TLS sessions are reused by
// every exchange. libcurl asks for one lock per kind of data.
class CurlShare {
public:
    static CURLSH* handle() {
        static std::once_flag once;
        static CurlShare* instance = nullptr;
        // Never destroyed: connections stay pooled until the process ends, and an
        // exchange still running during static destruction never meets a dead share.
        std::call_once(once, [] {
            curl_global_init(CURL_GLOBAL_DEFAULT);
            instance = new CurlShare;
        });
        return instance->share_;
    }

private:
    CurlShare() : share_(curl_share_init()) {
        if (!share_) return;
        curl_share_setopt(share_, CURLSHOPT_LOCKFUNC, &CurlShare::lock);
        curl_share_setopt(share_, CURLSHOPT_UNLOCKFUNC, &CurlShare::unlock);
        curl_share_setopt(share_, CURLSHOPT_USERDATA, this);
        curl_share_setopt(share_, CURLSHOPT_SHARE, CURL_LOCK_DATA_CONNECT);
        curl_share_setopt(share_, CURLSHOPT_SHARE, CURL_LOCK_DATA_DNS);
        curl_share_setopt(share_, CURLSHOPT_SHARE, CURL_LOCK_DATA_SSL_SESSION);
    }

    static void lock(CURL*, curl_lock_data data, curl_lock_access, void* self) {
        static_cast<CurlShare*>(self)->mutexFor(data).lock();
    }
    static void unlock(CURL*, curl_lock_data data, void* self) {
        static_cast<CurlShare*>(self)->mutexFor(data).unlock();
    }
    std::mutex& mutexFor(curl_lock_data data) {
        int i = static_cast<int>(data);
        if (i < 0 || i >= CURL_LOCK_DATA_LAST) i = CURL_LOCK_DATA_NONE;
        return mutexes_[i];
    }

    CURLSH* share_;
    std::mutex mutexes_[CURL_LOCK_DATA_LAST];
};

enum class ContentClass { Image, ServiceException, Xml, Unknown };

ContentClass classify(const std::string& contentType) {
    if (contentType.size() >= 5 && VxString(contentType.substr(0, 5)).compare("image", true) == 0)
        return ContentClass::Image;
    const VxString type(contentType);
    if (type.startsWith("application/vnd.ogc.se_xml") || type.startsWith("text/html"))
        return ContentClass::ServiceException;
    if (type.startsWith("application/vnd.ogc.wms_xml") || type.startsWith("application/xml") ||
        type.startsWith("text/xml") || type.startsWith("multipart"))
        return ContentClass::Xml;
    return ContentClass::Unknown;
}

bool isCertificateError(CURLcode rc) {
    return rc == CURLE_PEER_FAILED_VERIFICATION || rc == CURLE_SSL_ISSUER_ERROR;
}

std::string replaceAll(std::string s, char what, const char* with) {
    const size_t withLen = std::strlen(with);
    for (size_t pos = s.find(what); pos != std::string::npos; pos = s.find(what, pos + withLen))
        s.replace(pos, 1, with);
    return s;
}

// The request target without its leading '/': for GET the path with the parameters
// joined as the query.
std::string buildResource(const VxHttpRequest& req) {
    if (req.post) return req.path;
    std::string resource = req.path;
    if (!req.parameters.empty()) {
        if (resource.empty()) {
            resource = req.parameters;
        } else {
            if (resource.find('?') == std::string::npos)
                resource += '?';
            else if (resource.back() != '?' && resource.back() != '&')
                resource += '&';
            resource += req.parameters;
        }
    }
    return replaceAll(resource, ' ', "%20");
}

std::string buildUrl(const VxHttpRequest& req, const std::string& resource) {
    std::string url = req.secure ? "https://" : "http://";
    // An IPv6 literal set directly by a caller needs its brackets in a URL.
    if (req.host.find(':') != std::string::npos && req.host.front() != '[')
        url += "[" + req.host + "]";
    else
        url += req.host;
    url += ':';
    url += std::to_string(static_cast<unsigned>(req.port) & 0xFFFFu);
    url += '/';
    // libcurl treats '#' as the start of a fragment and would cut the target there, and
    // refuses a raw space (only a POST resource can still hold one).
    url += replaceAll(replaceAll(resource, '#', "%23"), ' ', "%20");
    return url;
}

// What is learnt about the answer while it arrives, and when anything last moved.
struct Exchange {
    CURL* curl = nullptr;
    long stallLimit = 0;  // seconds without progress that end the exchange; 0 = none

    long status = 0;
    bool inResponse = false;
    bool hasContentType = false;
    std::string contentType;
    int completeResponses = 0;  // header blocks of non-1xx responses seen so far
    std::string body;
    size_t drained = 0;

    bool ready = false;  // connected (and handshaken): from now on stalls count
    bool stalled = false;
    curl_off_t uploaded = 0;
    Clock::time_point lastActivity;

    void begin() {
        status = 0;
        inResponse = hasContentType = false;
        contentType.clear();
        completeResponses = 0;
        body.clear();
        drained = 0;
        ready = stalled = false;
        uploaded = 0;
        lastActivity = Clock::now();
    }
};

// libcurl's low-speed check averages over several seconds, so a stall right after a
// burst of data would go unnoticed for too long; this watches for the stall itself.
int onProgress(void* user, curl_off_t, curl_off_t, curl_off_t, curl_off_t uploaded) {
    auto* x = static_cast<Exchange*>(user);
    if (x->stallLimit <= 0) return 0;
    const auto now = Clock::now();
    if (!x->ready) {
        // Until the connection is up, the connect time-out is in charge.
        curl_off_t pretransfer = 0;
        curl_easy_getinfo(x->curl, CURLINFO_PRETRANSFER_TIME_T, &pretransfer);
        if (pretransfer > 0) {
            x->ready = true;
            x->lastActivity = now;
        }
        return 0;
    }
    if (uploaded != x->uploaded) {
        x->uploaded = uploaded;
        x->lastActivity = now;
    }
    if (now - x->lastActivity >= std::chrono::seconds(x->stallLimit)) {
        x->stalled = true;
        return 1;
    }
    return 0;
}

size_t onHeader(char* buffer, size_t size, size_t count, void* user) {
    auto* x = static_cast<Exchange*>(user);
    const size_t len = size * count;
    x->lastActivity = Clock::now();
    std::string line(buffer, len);
    while (!line.empty() && (line.back() == '\n' || line.back() == '\r')) line.pop_back();

    if (line.compare(0, 5, "HTTP/") == 0) {
        // A new response (after a 1xx or a redirect): forget the previous one.
        x->status = 0;
        x->hasContentType = false;
        x->contentType.clear();
        x->inResponse = true;
        x->body.clear();
        x->drained = 0;
        size_t sp = line.find(' ');
        if (sp != std::string::npos) x->status = std::strtol(line.c_str() + sp + 1, nullptr, 10);
    } else if (line.empty()) {
        if (x->inResponse && x->status >= 200) {
            x->inResponse = false;
            ++x->completeResponses;
        }
    } else if (x->inResponse && !x->hasContentType && line.size() >= 13 &&
               VxString(line.substr(0, 13)).compare("content-type:", true) == 0) {
        size_t b = 13;
        while (b < line.size() && (line[b] == ' ' || line[b] == '\t')) ++b;
        size_t e = line.size();
        while (e > b && (line[e - 1] == ' ' || line[e - 1] == '\t')) --e;
        x->contentType = line.substr(b, e - b);
        x->hasContentType = true;
    }
    return len;
}

size_t onBody(char* data, size_t size, size_t count, void* user) {
    auto* x = static_cast<Exchange*>(user);
    const size_t len = size * count;
    x->lastActivity = Clock::now();
    if (x->status != 200) {
        // A redirect's or an error's body: not wanted, but cheap ones are drained.
        if (x->drained + len > kMaxDrainedBody) return 0;
        x->drained += len;
        return len;
    }
    // Without a content type, or with one no caller can use, nothing is read.
    if (!x->hasContentType || classify(x->contentType) == ContentClass::Unknown) return 0;
    x->body.append(data, len);
    return len;
}

struct EasyHandle {
    CURL* curl = curl_easy_init();
    curl_slist* headers = nullptr;
    ~EasyHandle() {
        if (curl) curl_easy_cleanup(curl);
        curl_slist_free_all(headers);
    }
};

bool append(curl_slist*& list, const char* line) {
    curl_slist* grown = curl_slist_append(list, line);
    if (!grown) return false;
    list = grown;
    return true;
}

// Everything that does not depend on the attempt. Returns the first failing code.
CURLcode configure(EasyHandle& h, const VxHttpRequest& req, const std::string& url, const std::string& body,
                   Exchange& x) {
    CURL* c = h.curl;
    CURLcode rc = CURLE_OK;
    auto set = [&rc](CURLcode r) {
        if (rc == CURLE_OK) rc = r;
    };
    const long timeout = req.timeout > 0 ? req.timeout : 0;

    set(curl_easy_setopt(c, CURLOPT_SHARE, CurlShare::handle()));
    set(curl_easy_setopt(c, CURLOPT_NOSIGNAL, 1L));
    set(curl_easy_setopt(c, CURLOPT_USERAGENT, kUserAgent));
    set(curl_easy_setopt(c, CURLOPT_HTTP_VERSION, static_cast<long>(CURL_HTTP_VERSION_1_1)));
    set(curl_easy_setopt(c, CURLOPT_PATH_AS_IS, 1L));
    set(curl_easy_setopt(c, CURLOPT_SUPPRESS_CONNECT_HEADERS, 1L));

    set(curl_easy_setopt(c, CURLOPT_CONNECTTIMEOUT, timeout));
    // A stall of `timeout` seconds while sending or receiving ends the exchange;
    // a slow but steady answer may take as long as it needs.
    set(curl_easy_setopt(c, CURLOPT_LOW_SPEED_LIMIT, 1L));
    set(curl_easy_setopt(c, CURLOPT_LOW_SPEED_TIME, timeout));
    x.curl = c;
    x.stallLimit = timeout;
    set(curl_easy_setopt(c, CURLOPT_NOPROGRESS, 0L));
    set(curl_easy_setopt(c, CURLOPT_XFERINFOFUNCTION, &onProgress));
    set(curl_easy_setopt(c, CURLOPT_XFERINFODATA, &x));
    // Many threads fetching tiles from one server keep their connections pooled.
    set(curl_easy_setopt(c, CURLOPT_MAXCONNECTS, kMaxPooledConnections));

    set(curl_easy_setopt(c, CURLOPT_FOLLOWLOCATION, 1L));
    set(curl_easy_setopt(c, CURLOPT_MAXREDIRS, kMaxRedirects));
    set(curl_easy_setopt(c, CURLOPT_UNRESTRICTED_AUTH, 0L));
#if LIBCURL_VERSION_NUM >= 0x075500
    set(curl_easy_setopt(c, CURLOPT_PROTOCOLS_STR, "http,https"));
    set(curl_easy_setopt(c, CURLOPT_REDIR_PROTOCOLS_STR, "http,https"));
#else
    set(curl_easy_setopt(c, CURLOPT_PROTOCOLS, static_cast<long>(CURLPROTO_HTTP | CURLPROTO_HTTPS)));
    set(curl_easy_setopt(c, CURLOPT_REDIR_PROTOCOLS, static_cast<long>(CURLPROTO_HTTP | CURLPROTO_HTTPS)));
#endif

    if (!req.user.empty()) {
        set(curl_easy_setopt(c, CURLOPT_HTTPAUTH, static_cast<long>(CURLAUTH_BASIC)));
        set(curl_easy_setopt(c, CURLOPT_USERNAME, req.user.c_str()));
        set(curl_easy_setopt(c, CURLOPT_PASSWORD, req.password.c_str()));
    }

    if (!append(h.headers, kAcceptHeader)) set(CURLE_OUT_OF_MEMORY);
    if (req.post) {
        if (!append(h.headers, kFormContentType) || !append(h.headers, "Expect:")) set(CURLE_OUT_OF_MEMORY);
        set(curl_easy_setopt(c, CURLOPT_POST, 1L));
        set(curl_easy_setopt(c, CURLOPT_POSTFIELDSIZE_LARGE, static_cast<curl_off_t>(body.size())));
        set(curl_easy_setopt(c, CURLOPT_POSTFIELDS, body.data()));
    } else {
        set(curl_easy_setopt(c, CURLOPT_HTTPGET, 1L));
    }
    set(curl_easy_setopt(c, CURLOPT_HTTPHEADER, h.headers));

    set(curl_easy_setopt(c, CURLOPT_HEADERFUNCTION, &onHeader));
    set(curl_easy_setopt(c, CURLOPT_HEADERDATA, &x));
    set(curl_easy_setopt(c, CURLOPT_WRITEFUNCTION, &onBody));
    set(curl_easy_setopt(c, CURLOPT_WRITEDATA, &x));

    set(curl_easy_setopt(c, CURLOPT_URL, url.c_str()));
    return rc;
}

unsigned errorNumber(CURLcode rc) { return static_cast<unsigned>(rc); }

bool readBody(CURLcode rc, Exchange& x, VxHttpResponse& response) {
    if (rc != CURLE_OK) {
        VxLog::logf(VxLog::Error, "Failed to read data from server, error = %1%", errorNumber(rc));
        return false;
    }
    response.data = std::move(x.body);
    return true;
}

}  // namespace

void vxHttpSetCertificateFallback(bool enabled) { g_certificateFallback.store(enabled); }
bool vxHttpCertificateFallback() { return g_certificateFallback.load(); }

bool splitHttpUrl(const std::string& url, bool& secure, int& port, std::string& host, std::string& path) {
    secure = false;
    port = 80;
    host.clear();
    path.clear();

    size_t pos;
    if (url.compare(0, 7, "http://") == 0) {
        pos = 7;
    } else if (url.compare(0, 8, "https://") == 0) {
        secure = true;
        port = 443;
        pos = 8;
    } else {
        return false;
    }

    const size_t end = url.find_first_of("/:", pos);
    host = url.substr(pos, end == std::string::npos ? std::string::npos : end - pos);
    if (end == std::string::npos) return true;
    pos = end;

    if (url[pos] == ':') {
        const size_t slash = url.find('/', pos + 1);
        port = std::atoi(url.substr(pos + 1, slash == std::string::npos ? std::string::npos : slash - pos - 1).c_str());
        if (slash == std::string::npos) return true;
        pos = slash;
    }

    while (pos < url.size() && url[pos] == '/') ++pos;
    if (pos < url.size()) path = url.substr(pos);
    return true;
}

bool httpGet(const std::string& url, VxHttpResponse& response, int timeout, const std::string& user,
             const std::string& password) {
    VxHttpRequest req;
    if (!splitHttpUrl(url, req.secure, req.port, req.host, req.path)) return false;
    req.post = 0;
    req.timeout = timeout;
    req.user = user;
    req.password = password;
    return req.execute(response);
}

bool httpPost(const std::string& url, const std::string& body, VxHttpResponse& response, int timeout,
              const std::string& user, const std::string& password) {
    VxHttpRequest req;
    if (!splitHttpUrl(url, req.secure, req.port, req.host, req.path)) return false;
    req.post = 1;
    req.timeout = timeout;
    req.user = user;
    req.password = password;
    req.parameters = body;
    return req.execute(response);
}

bool VxHttpRequest::execute(VxHttpResponse& response) const {
    const std::string resource = buildResource(*this);
    const std::string body = post ? replaceAll(parameters, ' ', "+") : std::string();
    const std::string url = buildUrl(*this, resource);

    CurlShare::handle();  // global initialisation before the first easy handle
    EasyHandle h;
    if (!h.curl) {
        VxLog::logf(VxLog::Error, "InternetOpen() failed, error = %1%", errorNumber(CURLE_FAILED_INIT));
        return false;
    }
    Exchange x;
    const CURLcode setupRc = configure(h, *this, url, body, x);
    if (setupRc != CURLE_OK) {
        VxLog::logf(VxLog::Error, "HttpOpenRequest() failed, error = %1%", errorNumber(setupRc));
        return false;
    }

    CURLcode rc = CURLE_OK;
    for (int attempt = 0;; ++attempt) {
        x.begin();
        rc = curl_easy_perform(h.curl);
        if (x.stalled) rc = CURLE_OPERATION_TIMEDOUT;
        // The last request curl made got a complete header block unless it went on
        // to follow a redirect that never answered.
        long followed = 0;
        curl_easy_getinfo(h.curl, CURLINFO_REDIRECT_COUNT, &followed);
        if (x.completeResponses > followed) break;

        VxLog::logf(VxLog::Warning, "HttpSendRequest() failed, error = %1%", errorNumber(rc));
        if (attempt == 0 && isCertificateError(rc) && vxHttpCertificateFallback()) {
            curl_easy_setopt(h.curl, CURLOPT_SSL_VERIFYPEER, 0L);
            curl_easy_setopt(h.curl, CURLOPT_SSL_VERIFYHOST, 0L);
            continue;
        }
        return false;
    }

    if (x.status != 200) {
        VxLog::logf(VxLog::Error, "HTTP error, status = %1%", static_cast<unsigned long>(x.status));
        return false;
    }
    if (!x.hasContentType) {
        // No libcurl failure stands for a missing header; this is the nearest.
        VxLog::logf(VxLog::Error, "Failed to get content type, error = %1%", errorNumber(CURLE_WEIRD_SERVER_REPLY));
        return false;
    }
    response.contentType = x.contentType;

    switch (classify(x.contentType)) {
    case ContentClass::Image:
        response.xml = 0;
        return readBody(rc, x, response);
    case ContentClass::ServiceException:
        response.xml = 1;
        if (readBody(rc, x, response))
            VxLog::logf(VxLog::Error, "WMS server returned an exception: %1%", std::string(response.data.c_str()));
        else
            VxLog::error("WMS server signaled an error");
        return false;
    case ContentClass::Xml:
        response.xml = 1;
        return readBody(rc, x, response);
    case ContentClass::Unknown:
        break;
    }
    VxLog::logf(VxLog::Error, "Unknown content type returned from server: %1%", x.contentType);
    return false;
}

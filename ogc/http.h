#pragma once
// One synchronous HTTP exchange with a service: a GET or POST whose answer is read
// whole into memory and classified by its content type. Exchanges never throw for
// network or protocol failures; they log the cause and return false.
#include <cstdint>
#include <string>

// The answer of an exchange.
struct VxHttpResponse {
    uint32_t xml = 0;         // 0 = image, 1 = text (XML or a service exception)
    std::string data;         // the whole body as received, zero bytes included
    std::string contentType;  // the Content-Type value as the server sent it
};

// A plain value: callers set the fields, keep it as a template and execute copies.
struct VxHttpRequest {
    std::string host;        // as written in the URL
    std::string path;        // path and query, without the leading slashes
    std::string parameters;  // GET: appended as the query; POST: the body
    uint32_t post = 0;       // 0 = GET, otherwise POST
    int port = 80;           // only the low 16 bits are used
    bool secure = false;     // https
    int timeout = 10;        // seconds: connect, and the longest stall while sending or receiving
    std::string user;        // basic credentials when not empty
    std::string password;

    // Runs the exchange. True exactly when the status was 200, the content type is an
    // image or XML type and the whole body is in response.data. Safe to call from many
    // threads at once; connections are reused across calls.
    bool execute(VxHttpResponse& response) const;
};

// Splits an absolute "http://" or "https://" URL; false for any other scheme.
bool splitHttpUrl(const std::string& url, bool& secure, int& port, std::string& host, std::string& path);

bool httpGet(const std::string& url, VxHttpResponse& response, int timeout, const std::string& user,
             const std::string& password);
bool httpPost(const std::string& url, const std::string& body, VxHttpResponse& response, int timeout,
              const std::string& user, const std::string& password);

// Certificates are always verified. When the host application switches this on, an
// exchange whose first send fails on the server's certificate is sent once more with
// certificate checks off. Off by default; process-wide.
void vxHttpSetCertificateFallback(bool enabled);
bool vxHttpCertificateFallback();

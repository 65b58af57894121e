#pragma once
// An in-process HTTP(S) server on 127.0.0.1 with an ephemeral port, for tests that
// must see exactly what a client put on the wire.
//
//   LoopbackServer srv;
//   srv.on("/wms", [](const httplib::Request& rq, httplib::Response& rs) { ... });
//   srv.serve("/caps", xmlText, "application/xml");
//   httpGet(srv.url("/wms?REQUEST=GetMap"), ...);
//   auto seen = srv.requests();   // method, raw target, headers, body, remote port
//
// Every request is recorded before its handler runs, whatever the method or path.
// Paths without a handler answer 404. Handlers may be installed while serving.
#include <httplib.h>
#include <openssl/evp.h>
#include <openssl/pem.h>
#include <openssl/x509.h>
#include <openssl/x509v3.h>

#include <chrono>
#include <functional>
#include <map>
#include <memory>
#include <mutex>
#include <set>
#include <stdexcept>
#include <string>
#include <thread>
#include <vector>

// A throw-away key and self-signed certificate for 127.0.0.1 and localhost.
class SelfSignedCertificate {
public:
    SelfSignedCertificate() {
        key_ = EVP_EC_gen("P-256");
        cert_ = X509_new();
        if (!key_ || !cert_) throw std::runtime_error("cannot create a test certificate");
        X509_set_version(cert_, 2);
        ASN1_INTEGER_set(X509_get_serialNumber(cert_), 1);
        X509_gmtime_adj(X509_getm_notBefore(cert_), -3600);
        X509_gmtime_adj(X509_getm_notAfter(cert_), 24 * 3600);
        X509_set_pubkey(cert_, key_);
        X509_NAME* name = X509_get_subject_name(cert_);
        X509_NAME_add_entry_by_txt(name, "CN", MBSTRING_ASC, reinterpret_cast<const unsigned char*>("127.0.0.1"), -1,
                                   -1, 0);
        X509_set_issuer_name(cert_, name);
        X509V3_CTX ctx;
        X509V3_set_ctx_nodb(&ctx);
        X509V3_set_ctx(&ctx, cert_, cert_, nullptr, nullptr, 0);
        if (X509_EXTENSION* ext =
                X509V3_EXT_conf_nid(nullptr, &ctx, NID_subject_alt_name, "IP:127.0.0.1,DNS:localhost")) {
            X509_add_ext(cert_, ext, -1);
            X509_EXTENSION_free(ext);
        }
        if (!X509_sign(cert_, key_, EVP_sha256())) throw std::runtime_error("cannot sign a test certificate");
    }
    ~SelfSignedCertificate() {
        X509_free(cert_);
        EVP_PKEY_free(key_);
    }
    SelfSignedCertificate(const SelfSignedCertificate&) = delete;
    SelfSignedCertificate& operator=(const SelfSignedCertificate&) = delete;

    X509* certificate() const { return cert_; }
    EVP_PKEY* key() const { return key_; }

private:
    EVP_PKEY* key_ = nullptr;
    X509* cert_ = nullptr;
};

class LoopbackServer {
public:
    using Handler = std::function<void(const httplib::Request&, httplib::Response&)>;

    struct Request {
        std::string method;
        std::string target;  // the request target exactly as sent, query included
        std::string path;    // decoded path, as used for routing
        httplib::Headers headers;
        std::string body;
        int remotePort = -1;  // tells connections apart

        bool hasHeader(const std::string& name) const { return headers.find(name) != headers.end(); }
        size_t headerCount(const std::string& name) const { return headers.count(name); }
        std::string header(const std::string& name) const {
            auto it = headers.find(name);
            return it == headers.end() ? std::string() : it->second;
        }
    };

    // Plain HTTP.
    LoopbackServer() : server_(new httplib::Server) { start(); }
    // HTTPS with the given identity.
    explicit LoopbackServer(const SelfSignedCertificate& identity)
        : server_(new httplib::SSLServer(identity.certificate(), identity.key())) {
        if (!server_->is_valid()) throw std::runtime_error("cannot set up the TLS server");
        start();
    }

    ~LoopbackServer() {
        server_->stop();
        if (thread_.joinable()) thread_.join();
    }
    LoopbackServer(const LoopbackServer&) = delete;
    LoopbackServer& operator=(const LoopbackServer&) = delete;

    int port() const { return port_; }
    bool secure() const { return secure_; }
    // "http://127.0.0.1:<port>" followed by pathAndQuery, which should begin with '/'.
    std::string url(const std::string& pathAndQuery = "/") const {
        return std::string(secure_ ? "https" : "http") + "://127.0.0.1:" + std::to_string(port_) + pathAndQuery;
    }

    // Installs (or replaces) the handler for one decoded path, for every method.
    void on(const std::string& path, Handler handler) {
        std::lock_guard<std::mutex> g(mutex_);
        handlers_[path] = std::move(handler);
    }
    // Answers a path with a fixed body.
    void serve(const std::string& path, std::string body, std::string contentType, int status = 200) {
        on(path, [body = std::move(body), contentType = std::move(contentType), status](const httplib::Request&,
                                                                                         httplib::Response& res) {
            res.status = status;
            res.set_content(body, contentType.c_str());
        });
    }

    // A copy of every request received so far, in arrival order.
    std::vector<Request> requests() const {
        std::lock_guard<std::mutex> g(mutex_);
        return requests_;
    }
    // Requests received for one decoded path.
    std::vector<Request> requests(const std::string& path) const {
        std::vector<Request> out;
        for (auto& r : requests())
            if (r.path == path) out.push_back(r);
        return out;
    }
    void clearRequests() {
        std::lock_guard<std::mutex> g(mutex_);
        requests_.clear();
    }
    // Connections that carried at least one request (each has its own client port).
    size_t connectionCount() const {
        std::set<int> ports;
        for (auto& r : requests()) ports.insert(r.remotePort);
        return ports.size();
    }

private:
    void start() {
        secure_ = dynamic_cast<httplib::SSLServer*>(server_.get()) != nullptr;
        // Idle keep-alive connections hold a worker until this time-out, and stopping the
        // server waits for them: keep it short.
        server_->set_keep_alive_timeout(1);
        server_->set_keep_alive_max_count(1000);
        server_->set_tcp_nodelay(true);
        // Each open connection occupies a worker; clients that pool connections and
        // tests that stall answers need more than the default handful.
        server_->new_task_queue = [] { return new httplib::ThreadPool(32); };
        auto dispatch = [this](const httplib::Request& req, httplib::Response& res) { handle(req, res); };
        // Bodies are read here rather than by httplib, which refuses form bodies over 8 KiB.
        auto withBody = [this](const httplib::Request& req, httplib::Response& res,
                               const httplib::ContentReader& reader) {
            httplib::Request full = req;
            full.body.clear();
            reader([&full](const char* data, size_t len) {
                full.body.append(data, len);
                return true;
            });
            handle(full, res);
        };
        const char* all = ".*";
        server_->Get(all, dispatch);
        server_->Post(all, withBody);
        server_->Put(all, withBody);
        server_->Patch(all, withBody);
        server_->Delete(all, withBody);
        server_->Options(all, dispatch);
        port_ = server_->bind_to_any_port("127.0.0.1");
        if (port_ <= 0) throw std::runtime_error("cannot bind a loopback port");
        // The socket already listens: clients may connect before the accept loop runs.
        thread_ = std::thread([this] { server_->listen_after_bind(); });
        // stop() is a no-op until the accept loop runs; a test that ends at once would
        // otherwise leave the destructor joining a server that never stops.
        for (int i = 0; i < 5000 && !server_->is_running(); ++i)
            std::this_thread::sleep_for(std::chrono::milliseconds(1));
    }

    void handle(const httplib::Request& req, httplib::Response& res) {
        Handler handler;
        {
            std::lock_guard<std::mutex> g(mutex_);
            Request r;
            r.method = req.method;
            r.target = req.target;
            r.path = req.path;
            r.headers = req.headers;
            r.body = req.body;
            r.remotePort = req.remote_port;
            requests_.push_back(std::move(r));
            auto it = handlers_.find(req.path);
            if (it != handlers_.end()) handler = it->second;
        }
        if (handler)
            handler(req, res);
        else
            res.status = 404;
    }

    std::unique_ptr<httplib::Server> server_;
    bool secure_ = false;
    int port_ = -1;
    std::thread thread_;
    mutable std::mutex mutex_;
    std::map<std::string, Handler> handlers_;
    std::vector<Request> requests_;
};

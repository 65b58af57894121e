#include <gtest/gtest.h>

#include <curl/curl.h>
#include <netinet/in.h>
#include <sys/socket.h>
#include <unistd.h>

#include <atomic>
#include <chrono>
#include <cstdlib>
#include <memory>
#include <mutex>
#include <string>
#include <thread>
#include <vector>

#include "ogc/http.h"
#include "support/loopback_server.h"
#include "vx/log.h"

namespace {

using Clock = std::chrono::steady_clock;

struct LogLine {
    int level;
    std::string text;
};

class LogCapture {
public:
    LogCapture() {
        VxLog::setSink([this](int level, const char*, const std::string& t) {
            std::lock_guard<std::mutex> g(m_);
            lines_.push_back({level, t});
        });
    }
    ~LogCapture() { VxLog::setSink(nullptr); }
    std::vector<LogLine> lines() {
        std::lock_guard<std::mutex> g(m_);
        return lines_;
    }
    void clear() {
        std::lock_guard<std::mutex> g(m_);
        lines_.clear();
    }

private:
    std::mutex m_;
    std::vector<LogLine> lines_;
};

// Holds a handler back until the test releases it (or a safety limit passes), so a
// stalled server never delays the server's shutdown for long. Handlers share it, as
// the server may still call them after the test has finished.
class Gate {
public:
    void wait() {
        auto until = Clock::now() + std::chrono::seconds(5);
        while (!open_ && Clock::now() < until) std::this_thread::sleep_for(std::chrono::milliseconds(10));
    }
    void open() { open_ = true; }

private:
    std::atomic<bool> open_{false};
};

struct FallbackSwitch {
    explicit FallbackSwitch(bool on) { vxHttpSetCertificateFallback(on); }
    ~FallbackSwitch() { vxHttpSetCertificateFallback(false); }
};

void expectOneLine(LogCapture& log, int level, const std::string& text) {
    auto lines = log.lines();
    ASSERT_EQ(lines.size(), 1u) << (lines.empty() ? "" : lines.front().text);
    EXPECT_EQ(lines[0].level, level);
    EXPECT_EQ(lines[0].text, text);
}

class HttpExchange : public ::testing::Test {
protected:
    static void SetUpTestSuite() {
        setenv("no_proxy", "127.0.0.1,localhost", 1);
        server_ = new LoopbackServer;
    }
    static void TearDownTestSuite() {
        delete server_;
        server_ = nullptr;
    }
    void SetUp() override { server_->clearRequests(); }

    static VxHttpRequest requestFor(const std::string& pathAndQuery) {
        VxHttpRequest req;
        EXPECT_TRUE(splitHttpUrl(server_->url(pathAndQuery), req.secure, req.port, req.host, req.path));
        return req;
    }
    static std::string url(const std::string& pathAndQuery) { return server_->url(pathAndQuery); }

    static LoopbackServer* server_;
    LogCapture log_;
};
LoopbackServer* HttpExchange::server_ = nullptr;

int unusedLoopbackPort() {
    int fd = socket(AF_INET, SOCK_STREAM, 0);
    sockaddr_in a{};
    a.sin_family = AF_INET;
    a.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
    bind(fd, reinterpret_cast<sockaddr*>(&a), sizeof a);
    socklen_t len = sizeof a;
    getsockname(fd, reinterpret_cast<sockaddr*>(&a), &len);
    close(fd);
    return ntohs(a.sin_port);
}

}  // namespace

TEST(SplitHttpUrl, SchemesPortsAndPaths) {
    bool secure = false;
    int port = 0;
    std::string host, path;

    ASSERT_TRUE(splitHttpUrl("https://maps.example.org/ows/wms?SERVICE=WMS&a=b:c", secure, port, host, path));
    EXPECT_TRUE(secure);
    EXPECT_EQ(port, 443);
    EXPECT_EQ(host, "maps.example.org");
    EXPECT_EQ(path, "ows/wms?SERVICE=WMS&a=b:c");

    ASSERT_TRUE(splitHttpUrl("http://10.0.0.1:8080//cgi-bin/mapserv", secure, port, host, path));
    EXPECT_FALSE(secure);
    EXPECT_EQ(port, 8080);
    EXPECT_EQ(host, "10.0.0.1");
    EXPECT_EQ(path, "cgi-bin/mapserv");

    // A ':' after the first '/' belongs to the path, not the port.
    ASSERT_TRUE(splitHttpUrl("http://h/a:b", secure, port, host, path));
    EXPECT_EQ(port, 80);
    EXPECT_EQ(host, "h");
    EXPECT_EQ(path, "a:b");

    for (const char* bare : {"http://host", "http://host/", "http://host///"}) {
        path = "stale";
        ASSERT_TRUE(splitHttpUrl(bare, secure, port, host, path)) << bare;
        EXPECT_EQ(host, "host") << bare;
        EXPECT_EQ(path, "") << bare;
        EXPECT_EQ(port, 80) << bare;
    }

    ASSERT_TRUE(splitHttpUrl("https://host:abc/x", secure, port, host, path));
    EXPECT_EQ(port, 0);
    EXPECT_EQ(path, "x");
    ASSERT_TRUE(splitHttpUrl("http://host:9000", secure, port, host, path));
    EXPECT_EQ(port, 9000);
    EXPECT_EQ(path, "");
}

TEST(SplitHttpUrl, OtherSchemesDoNotSplitAndFetchNothing) {
    bool secure = true;
    int port = 1;
    std::string host = "x", path = "y";
    for (const char* url : {"ftp://host/a", "HTTP://host/a", "Https://host/a", "http:/host", "host/a", ""}) {
        EXPECT_FALSE(splitHttpUrl(url, secure, port, host, path)) << url;
        EXPECT_FALSE(secure);
        EXPECT_EQ(port, 80);
        EXPECT_EQ(host, "");
    }
    LogCapture log;
    VxHttpResponse r;
    EXPECT_FALSE(httpGet("file:///etc/passwd", r, 1, "", ""));
    EXPECT_FALSE(httpPost("HTTP://127.0.0.1/", "a=b", r, 1, "", ""));
    EXPECT_TRUE(log.lines().empty());
}

TEST_F(HttpExchange, GetJoinsParametersIntoTheQueryAsSent) {
    server_->serve("/wms", "<ok/>", "text/xml");
    struct Case {
        const char* path;
        const char* parameters;
        const char* target;
    } cases[] = {
        {"wms?SERVICE=WMS", "REQUEST=GetMap", "/wms?SERVICE=WMS&REQUEST=GetMap"},
        {"wms?", "REQUEST=GetMap", "/wms?REQUEST=GetMap"},
        {"wms?SERVICE=WMS&", "REQUEST=GetMap", "/wms?SERVICE=WMS&REQUEST=GetMap"},
        {"wms", "REQUEST=GetMap", "/wms?REQUEST=GetMap"},
        {"wms?a=1", "", "/wms?a=1"},
        {"", "wms", "/wms"},
        {"wms", "LAYERS=roads and rails&STYLES=", "/wms?LAYERS=roads%20and%20rails&STYLES="},
        // Everything but spaces goes out untouched; nothing is escaped twice.
        {"wms?x=a b", "FORMAT=image/png;%20mode=8bit&BBOX=-1.5,2e3&L=a|b(c)*'!$@:",
         "/wms?x=a%20b&FORMAT=image/png;%20mode=8bit&BBOX=-1.5,2e3&L=a|b(c)*'!$@:"},
    };
    for (const Case& c : cases) {
        server_->clearRequests();
        VxHttpRequest req = requestFor("/");
        req.path = c.path;
        req.parameters = c.parameters;
        VxHttpResponse r;
        EXPECT_TRUE(req.execute(r)) << c.target;
        auto seen = server_->requests();
        ASSERT_EQ(seen.size(), 1u) << c.target;
        EXPECT_EQ(seen[0].method, "GET");
        EXPECT_EQ(seen[0].target, c.target);
        EXPECT_EQ(seen[0].body, "");
    }
}

TEST_F(HttpExchange, GetSendsAgentAndAcceptListButNoBodyHeaders) {
    server_->serve("/caps", "<WMS_Capabilities/>", "application/vnd.ogc.wms_xml");
    VxHttpResponse r;
    ASSERT_TRUE(httpGet(url("/caps?SERVICE=WMS&REQUEST=GetCapabilities"), r, 5, "", ""));
    EXPECT_EQ(r.data, "<WMS_Capabilities/>");
    EXPECT_EQ(r.xml, 1u);
    EXPECT_EQ(r.contentType, "application/vnd.ogc.wms_xml");

    auto seen = server_->requests();
    ASSERT_EQ(seen.size(), 1u);
    EXPECT_EQ(seen[0].target, "/caps?SERVICE=WMS&REQUEST=GetCapabilities");
    EXPECT_EQ(seen[0].header("User-Agent"), "Veltrano Engine OGC Reader");
    EXPECT_EQ(seen[0].headerCount("Accept"), 1u);
    EXPECT_EQ(seen[0].header("Accept"),
              "image/*, application/vnd.ogc.wms_xml, application/vnd.ogc.se_xml, application/xml, text/xml");
    EXPECT_FALSE(seen[0].hasHeader("Content-Type"));
    EXPECT_FALSE(seen[0].hasHeader("Authorization"));
    EXPECT_TRUE(log_.lines().empty());
}

TEST_F(HttpExchange, PostSendsFormBodyWithPlusForSpaces) {
    server_->serve("/csw", "<GetRecordsResponse/>", "application/xml");
    VxHttpResponse r;
    ASSERT_TRUE(httpPost(url("/csw?x=1 2"), "request=GetRecords&q=land cover", r, 5, "", ""));
    EXPECT_EQ(r.data, "<GetRecordsResponse/>");

    // A body far beyond the size at which libcurl would otherwise ask for 100-continue.
    std::string big(1500 * 1024, 'a');
    big[10] = ' ';
    ASSERT_TRUE(httpPost(url("/csw"), big, r, 5, "", "")) << (log_.lines().empty() ? "" : log_.lines()[0].text);

    auto seen = server_->requests();
    ASSERT_EQ(seen.size(), 2u);
    EXPECT_EQ(seen[0].method, "POST");
    // A raw space cannot go into a request line, not even in a POST's path.
    EXPECT_EQ(seen[0].target, "/csw?x=1%202");
    EXPECT_EQ(seen[0].body, "request=GetRecords&q=land+cover");
    EXPECT_EQ(seen[0].header("Content-Type"), "application/x-www-form-urlencoded");
    EXPECT_EQ(seen[0].headerCount("Content-Type"), 1u);
    EXPECT_EQ(seen[0].header("User-Agent"), "Veltrano Engine OGC Reader");
    for (auto& s : seen) EXPECT_FALSE(s.hasHeader("Expect"));
    big[10] = '+';
    EXPECT_EQ(seen[1].body, big);
}

TEST_F(HttpExchange, OnlyStatus200Succeeds) {
    for (int status : {201, 204, 304, 404, 500}) {
        server_->serve("/s", status == 204 || status == 304 ? "" : "<x/>", "text/xml", status);
        log_.clear();
        VxHttpResponse r;
        r.data = "before";
        EXPECT_FALSE(httpGet(url("/s"), r, 5, "", "")) << status;
        expectOneLine(log_, VxLog::Error, "HTTP error, status = " + std::to_string(status));
        EXPECT_EQ(r.data, "before");
        EXPECT_EQ(r.contentType, "");
    }
    // Nothing is written when the log level drops errors.
    log_.clear();
    VxLog::logLevel(5);
    VxHttpResponse r;
    EXPECT_FALSE(httpGet(url("/s"), r, 5, "", ""));
    VxLog::logLevel(VxLog::Info);
    EXPECT_TRUE(log_.lines().empty());
}

TEST_F(HttpExchange, ContentTypesClassifyTheAnswer) {
    struct Case {
        const char* type;
        bool ok;
        uint32_t xml;
    } cases[] = {
        {"IMAGE/Png", true, 0},
        {"image/jpeg", true, 0},
        {"text/xml; charset=UTF-8", true, 1},
        {"application/xml", true, 1},
        {"application/vnd.ogc.wms_xml", true, 1},
        {"multipart/mixed; boundary=wcs", true, 1},
    };
    for (const Case& c : cases) {
        server_->serve("/t", std::string("body of ") + c.type, c.type);
        VxHttpResponse r;
        r.xml = 7;
        EXPECT_EQ(httpGet(url("/t"), r, 5, "", ""), c.ok) << c.type;
        EXPECT_EQ(r.xml, c.xml) << c.type;
        EXPECT_EQ(r.contentType, c.type);
        EXPECT_EQ(r.data, std::string("body of ") + c.type);
    }
    EXPECT_TRUE(log_.lines().empty());
}

TEST_F(HttpExchange, ServiceExceptionsAndHtmlFailButKeepTheBody) {
    const std::string exception("<ServiceExceptionReport>bad layer</ServiceExceptionReport>\0tail", 63);
    for (const char* type : {"application/vnd.ogc.se_xml", "text/html; charset=utf-8"}) {
        server_->serve("/e", exception, type);
        log_.clear();
        VxHttpResponse r;
        EXPECT_FALSE(httpGet(url("/e"), r, 5, "", "")) << type;
        EXPECT_EQ(r.xml, 1u);
        EXPECT_EQ(r.contentType, type);
        EXPECT_EQ(r.data, exception);
        // The log line stops at the first zero byte.
        expectOneLine(log_, VxLog::Error,
                      "WMS server returned an exception: <ServiceExceptionReport>bad layer</ServiceExceptionReport>");
    }
}

TEST_F(HttpExchange, UnknownContentTypeIsRefusedWithoutReadingTheBody) {
    auto gate = std::make_shared<Gate>();
    // The body starts, then stalls: reading it would take until the gate opens.
    server_->on("/json", [gate](const httplib::Request&, httplib::Response& res) {
        res.set_chunked_content_provider("application/json", [gate](size_t offset, httplib::DataSink& sink) {
            if (offset == 0) {
                sink.write("{\"a\":", 5);
                return true;
            }
            gate->wait();
            sink.done();
            return true;
        });
    });
    VxHttpResponse r;
    r.data = "untouched";
    r.xml = 1;
    auto start = Clock::now();
    EXPECT_FALSE(httpGet(url("/json"), r, 10, "", ""));
    EXPECT_LT(Clock::now() - start, std::chrono::seconds(2));
    gate->open();
    EXPECT_EQ(r.data, "untouched");
    EXPECT_EQ(r.xml, 1u);
    EXPECT_EQ(r.contentType, "application/json");
    expectOneLine(log_, VxLog::Error, "Unknown content type returned from server: application/json");
}

TEST_F(HttpExchange, BinaryBodiesArriveWhole) {
    std::string image;
    for (int i = 0; i < 100 * 1024 + 17; ++i) image += static_cast<char>(i % 251);
    ASSERT_EQ(image[0], '\0');
    server_->serve("/tile.png", image, "image/png");
    server_->serve("/empty", "", "image/png");

    VxHttpResponse r;
    ASSERT_TRUE(httpGet(url("/tile.png"), r, 5, "", ""));
    EXPECT_EQ(r.xml, 0u);
    EXPECT_EQ(r.data.size(), image.size());
    EXPECT_TRUE(r.data == image);

    ASSERT_TRUE(httpGet(url("/empty"), r, 5, "", ""));
    EXPECT_EQ(r.data, "");
}

TEST_F(HttpExchange, SilentServerTimesOutBeforeTheStatus) {
    auto gate = std::make_shared<Gate>();
    server_->on("/slow", [gate](const httplib::Request&, httplib::Response& res) {
        gate->wait();
        res.set_content("<late/>", "text/xml");
    });
    VxHttpRequest req = requestFor("/slow");
    req.timeout = 1;
    VxHttpResponse r;
    auto start = Clock::now();
    EXPECT_FALSE(req.execute(r));
    auto took = Clock::now() - start;
    gate->open();
    EXPECT_GE(took, std::chrono::milliseconds(900));
    EXPECT_LT(took, std::chrono::seconds(4));
    expectOneLine(log_, VxLog::Warning, "HttpSendRequest() failed, error = " + std::to_string(CURLE_OPERATION_TIMEDOUT));
}

TEST_F(HttpExchange, StalledBodyFailsTheRead) {
    auto gate = std::make_shared<Gate>();
    server_->on("/stall", [gate](const httplib::Request&, httplib::Response& res) {
        res.set_chunked_content_provider("image/png", [gate](size_t offset, httplib::DataSink& sink) {
            if (offset == 0) {
                sink.write("\x89PNG", 4);
                return true;
            }
            gate->wait();
            sink.done();
            return true;
        });
    });
    VxHttpRequest req = requestFor("/stall");
    req.timeout = 1;
    VxHttpResponse r;
    r.data = "previous";
    auto start = Clock::now();
    EXPECT_FALSE(req.execute(r));
    EXPECT_LT(Clock::now() - start, std::chrono::seconds(4));
    gate->open();
    EXPECT_EQ(r.data, "previous");
    EXPECT_EQ(r.contentType, "image/png");
    expectOneLine(log_, VxLog::Error,
                  "Failed to read data from server, error = " + std::to_string(CURLE_OPERATION_TIMEDOUT));
}

TEST_F(HttpExchange, RefusedConnectionIsASendFailure) {
    VxHttpResponse r;
    EXPECT_FALSE(httpGet("http://127.0.0.1:" + std::to_string(unusedLoopbackPort()) + "/wms", r, 2, "", ""));
    expectOneLine(log_, VxLog::Warning, "HttpSendRequest() failed, error = " + std::to_string(CURLE_COULDNT_CONNECT));
}

TEST_F(HttpExchange, CredentialsGoToTheServerButNotToAnotherHost) {
    server_->serve("/target", "<ok/>", "text/xml");
    const std::string elsewhere = "http://localhost:" + std::to_string(server_->port()) + "/target";
    server_->on("/away", [elsewhere](const httplib::Request&, httplib::Response& res) {
        res.set_redirect(elsewhere.c_str(), 302);
    });
    server_->on("/here", [](const httplib::Request&, httplib::Response& res) { res.set_redirect("/target", 302); });

    VxHttpResponse r;
    ASSERT_TRUE(httpGet(url("/here"), r, 5, "alice", "s3cret"));
    ASSERT_TRUE(httpGet(url("/away"), r, 5, "alice", "s3cret"));
    EXPECT_EQ(r.data, "<ok/>");

    auto seen = server_->requests();
    ASSERT_EQ(seen.size(), 4u);
    const std::string basic = "Basic YWxpY2U6czNjcmV0";
    EXPECT_EQ(seen[0].header("Authorization"), basic);
    EXPECT_EQ(seen[1].header("Authorization"), basic);  // same host
    EXPECT_EQ(seen[2].header("Authorization"), basic);
    EXPECT_EQ(seen[3].target, "/target");
    EXPECT_EQ(seen[3].header("Host"), "localhost:" + std::to_string(server_->port()));
    EXPECT_FALSE(seen[3].hasHeader("Authorization"));
}

TEST_F(HttpExchange, RedirectsAreBounded) {
    server_->on("/loop", [](const httplib::Request&, httplib::Response& res) { res.set_redirect("/loop", 302); });
    server_->on("/ftp", [](const httplib::Request&, httplib::Response& res) {
        res.set_redirect("ftp://127.0.0.1/x", 302);
    });
    VxHttpResponse r;
    EXPECT_FALSE(httpGet(url("/loop"), r, 5, "", ""));
    EXPECT_EQ(server_->requests("/loop").size(), 6u);  // the request and five follow-ups
    expectOneLine(log_, VxLog::Error, "HTTP error, status = 302");

    log_.clear();
    EXPECT_FALSE(httpGet(url("/ftp"), r, 5, "", ""));
    expectOneLine(log_, VxLog::Warning,
                  "HttpSendRequest() failed, error = " + std::to_string(CURLE_UNSUPPORTED_PROTOCOL));
}

TEST_F(HttpExchange, SequentialExchangesReuseOneConnection) {
    server_->serve("/tile", "png", "image/png");
    for (int i = 0; i < 4; ++i) {
        VxHttpResponse r;
        ASSERT_TRUE(requestFor("/tile").execute(r));
    }
    ASSERT_EQ(server_->requests().size(), 4u);
    EXPECT_EQ(server_->connectionCount(), 1u);
}

TEST_F(HttpExchange, ConcurrentExchangesKeepTheirOwnAnswers) {
    server_->on("/echo", [](const httplib::Request& req, httplib::Response& res) {
        std::this_thread::sleep_for(std::chrono::milliseconds(5));
        res.set_content("<id>" + req.get_param_value("id") + "</id>", "text/xml");
    });
    const int threads = 8, perThread = 5;
    std::atomic<int> wrong{0};
    std::vector<std::thread> pool;
    for (int t = 0; t < threads; ++t) {
        pool.emplace_back([t, &wrong] {
            for (int i = 0; i < perThread; ++i) {
                const std::string id = std::to_string(t * 100 + i);
                VxHttpRequest req = requestFor("/echo");
                req.parameters = "id=" + id;
                VxHttpResponse r;
                if (!req.execute(r) || r.data != "<id>" + id + "</id>") ++wrong;
            }
        });
    }
    for (auto& th : pool) th.join();
    EXPECT_EQ(wrong.load(), 0);
    EXPECT_EQ(server_->requests().size(), static_cast<size_t>(threads * perThread));
    // Pooled connections are shared, so no more are opened than exchanges ran at once.
    EXPECT_LE(server_->connectionCount(), static_cast<size_t>(threads));
    EXPECT_TRUE(log_.lines().empty());
}

TEST(HttpsExchange, SelfSignedCertificateNeedsTheFallback) {
    setenv("no_proxy", "127.0.0.1,localhost", 1);
    SelfSignedCertificate identity;
    LoopbackServer server(identity);
    server.serve("/wms", "<WMT_MS_Capabilities/>", "application/vnd.ogc.wms_xml");
    const std::string certError = "HttpSendRequest() failed, error = " + std::to_string(CURLE_PEER_FAILED_VERIFICATION);
    ASSERT_FALSE(vxHttpCertificateFallback());

    {
        LogCapture log;
        VxHttpResponse r;
        EXPECT_FALSE(httpGet(server.url("/wms"), r, 5, "", ""));
        expectOneLine(log, VxLog::Warning, certError);
        EXPECT_TRUE(server.requests().empty());
    }
    {
        FallbackSwitch on(true);
        LogCapture log;
        VxHttpResponse r;
        EXPECT_TRUE(httpGet(server.url("/wms"), r, 5, "", ""));
        EXPECT_EQ(r.data, "<WMT_MS_Capabilities/>");
        expectOneLine(log, VxLog::Warning, certError);
        EXPECT_EQ(server.requests().size(), 1u);
    }
    // Switching it off again restores verification, even with relaxed connections pooled.
    LogCapture log;
    VxHttpResponse r;
    EXPECT_FALSE(httpGet(server.url("/wms"), r, 5, "", ""));
    expectOneLine(log, VxLog::Warning, certError);
    EXPECT_EQ(server.requests().size(), 1u);
}

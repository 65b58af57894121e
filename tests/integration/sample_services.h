#pragma once
// The sample MapServer behind scripts/sample-services.py, started once per test program
// on a free loopback port and stopped at exit.
//
//   SampleServices::url("/wms")      http://127.0.0.1:PORT/wms   (map "world", WMS)
//   SampleServices::url("/wcs")      same map, for WCS requests
//   SampleServices::url("/wms4326")  map "wgs84", whose only CRS is EPSG:4326
//   SampleServices::requestCount()   service requests since start or the last reset
//   SampleServices::requestLog()     their lines, "GET /wms?..." (the last 200)
//   SampleServices::resetStats()
//   SampleServices::dataDir()        the generated sample data
//   SampleServices::get(url), post(url, body, type)   plain HTTP exchanges
//
// Test fixtures derive from SampleServicesTest, which fails the test when the server
// could not be started (it is started from the calling thread, whose end stops it on
// Linux: start it from the main thread, as SampleServicesTest::SetUp does). The data
// directory is $VX_SAMPLES_DIR when set.
#include <curl/curl.h>
#include <signal.h>
#include <stdlib.h>
#include <sys/types.h>
#include <sys/wait.h>
#include <unistd.h>
#ifdef __linux__
#include <sys/prctl.h>
#endif

#include <chrono>
#include <cstring>
#include <fstream>
#include <nlohmann/json.hpp>
#include <stdexcept>
#include <string>
#include <thread>
#include <vector>

#include <gtest/gtest.h>

class SampleServices {
public:
    struct Response {
        long status = 0;
        std::string contentType;
        std::string body;
        std::string error;  // transfer error text; empty when an answer arrived
    };

    static bool available() { return instance().port_ > 0; }
    static const std::string& startError() { return instance().error_; }
    static int port() { return instance().requirePort(); }
    static std::string dataDir() { return instance().dataDir_; }

    static std::string url(const std::string& path) {
        return "http://127.0.0.1:" + std::to_string(port()) + path;
    }

    static Response get(const std::string& url) { return exchange(url, nullptr, nullptr); }

    static Response post(const std::string& url, const std::string& body,
                         const std::string& contentType) {
        return exchange(url, &body, &contentType);
    }

    static long requestCount() { return stats().at("requests").get<long>(); }

    static std::vector<std::string> requestLog() {
        return stats().at("log").get<std::vector<std::string>>();
    }

    static void resetStats() {
        Response r = post(url("/__reset"), "", "text/plain");
        if (r.status != 200) throw std::runtime_error("sample services: reset failed " + r.error);
    }

private:
    pid_t child_ = -1;
    int port_ = 0;
    std::string error_;
    std::string dataDir_;
    std::string runDir_;

    static SampleServices& instance() {
        static SampleServices services;
        return services;
    }

    SampleServices() {
        curl_global_init(CURL_GLOBAL_DEFAULT);
        start();
    }

    ~SampleServices() {
        stop();
        if (!runDir_.empty()) {
            ::unlink((runDir_ + "/port").c_str());
            ::rmdir(runDir_.c_str());
        }
    }

    SampleServices(const SampleServices&) = delete;
    SampleServices& operator=(const SampleServices&) = delete;

    int requirePort() const {
        if (port_ <= 0) throw std::runtime_error("sample services not running: " + error_);
        return port_;
    }

    static std::string defaultDataDir() {
        if (const char* env = ::getenv("VX_SAMPLES_DIR"); env && *env) return env;
#ifdef VX_SAMPLES_DIR
        return VX_SAMPLES_DIR;
#else
        return std::string(VX_SOURCE_DIR) + "/build/samples";
#endif
    }

    void start() {
        dataDir_ = defaultDataDir();
        char tmpl[] = "/tmp/vx-samples-XXXXXX";
        if (!::mkdtemp(tmpl)) {
            error_ = std::string("mkdtemp: ") + std::strerror(errno);
            return;
        }
        runDir_ = tmpl;
        const std::string portFile = runDir_ + "/port";
        const std::string script = std::string(VX_SOURCE_DIR) + "/scripts/sample-services.py";

        // Everything the child needs is built before fork: only exec-safe calls after it.
        std::vector<std::string> args = {"python3", script,           "--port", "0",
                                         "--data",  dataDir_,         "--port-file", portFile};
        std::vector<char*> argv;
        for (auto& a : args) argv.push_back(a.data());
        argv.push_back(nullptr);
        const pid_t parent = ::getpid();

        child_ = ::fork();
        if (child_ < 0) {
            error_ = std::string("fork: ") + std::strerror(errno);
            return;
        }
        if (child_ == 0) {
#ifdef __linux__
            // Do not outlive a test program that crashed.
            ::prctl(PR_SET_PDEATHSIG, SIGTERM);
            if (::getppid() != parent) ::_exit(127);
#else
            (void)parent;
#endif
            ::execvp(argv[0], argv.data());
            ::_exit(127);
        }

        // Data generation on a cold start takes a few seconds; the port file appears once
        // the server listens.
        const auto deadline = std::chrono::steady_clock::now() + std::chrono::seconds(90);
        while (std::chrono::steady_clock::now() < deadline) {
            int status = 0;
            if (::waitpid(child_, &status, WNOHANG) == child_) {
                child_ = -1;
                error_ = "sample-services.py exited early (status " + std::to_string(status) +
                         "); run it by hand to see why";
                return;
            }
            std::ifstream in(portFile);
            int p = 0;
            if (in >> p && p > 0) {
                port_ = p;
                return;
            }
            std::this_thread::sleep_for(std::chrono::milliseconds(50));
        }
        error_ = "sample-services.py did not report a port within 90 s";
        stop();
    }

    void stop() {
        if (child_ <= 0) return;
        ::kill(child_, SIGTERM);
        for (int i = 0; i < 100; ++i) {
            if (::waitpid(child_, nullptr, WNOHANG) == child_) {
                child_ = -1;
                return;
            }
            std::this_thread::sleep_for(std::chrono::milliseconds(50));
        }
        ::kill(child_, SIGKILL);
        ::waitpid(child_, nullptr, 0);
        child_ = -1;
    }

    static size_t collect(char* data, size_t size, size_t n, void* out) {
        static_cast<std::string*>(out)->append(data, size * n);
        return size * n;
    }

    static Response exchange(const std::string& url, const std::string* body,
                             const std::string* contentType) {
        Response r;
        CURL* curl = curl_easy_init();
        if (!curl) {
            r.error = "curl_easy_init failed";
            return r;
        }
        curl_slist* headers = nullptr;
        curl_easy_setopt(curl, CURLOPT_URL, url.c_str());
        curl_easy_setopt(curl, CURLOPT_WRITEFUNCTION, &SampleServices::collect);
        curl_easy_setopt(curl, CURLOPT_WRITEDATA, &r.body);
        curl_easy_setopt(curl, CURLOPT_TIMEOUT, 60L);
        curl_easy_setopt(curl, CURLOPT_NOSIGNAL, 1L);
        curl_easy_setopt(curl, CURLOPT_NOPROXY, "*");
        if (body) {
            headers = curl_slist_append(headers, ("Content-Type: " + *contentType).c_str());
            curl_easy_setopt(curl, CURLOPT_HTTPHEADER, headers);
            curl_easy_setopt(curl, CURLOPT_POSTFIELDS, body->data());
            curl_easy_setopt(curl, CURLOPT_POSTFIELDSIZE_LARGE, (curl_off_t)body->size());
        }
        CURLcode rc = curl_easy_perform(curl);
        if (rc == CURLE_OK) {
            curl_easy_getinfo(curl, CURLINFO_RESPONSE_CODE, &r.status);
            char* type = nullptr;
            curl_easy_getinfo(curl, CURLINFO_CONTENT_TYPE, &type);
            if (type) r.contentType = type;
        } else {
            r.error = curl_easy_strerror(rc);
        }
        curl_slist_free_all(headers);
        curl_easy_cleanup(curl);
        return r;
    }

    static nlohmann::json stats() {
        Response r = get(url("/__stats"));
        if (r.status != 200) throw std::runtime_error("sample services: stats failed " + r.error);
        return nlohmann::json::parse(r.body);
    }
};

// Base for tests that talk to the sample services.
class SampleServicesTest : public ::testing::Test {
protected:
    void SetUp() override {
        ASSERT_TRUE(SampleServices::available())
            << "sample services could not start: " << SampleServices::startError();
    }
};

// A small HTTP server inside a test: it hands every request to a function and records it.
#ifndef VELT_TESTS_CLI_HTTP_SERVER_H
#define VELT_TESTS_CLI_HTTP_SERVER_H

#include <functional>
#include <mutex>
#include <string>
#include <thread>
#include <vector>

struct HttpRequest {
    std::string method;
    std::string target;
    std::string head; ///< all header lines, as they came
    std::string body;
};

struct HttpReply {
    int status = 200;
    std::string body;
    std::string contentType = "application/json";
    bool stream = false; ///< no length, and the connection stays open until the client or the server leaves
    bool drop = false;   ///< no answer at all
    std::string etag{};  ///< empty: no such header
    std::string link{};  ///< the same
};

class HttpServer {
public:
    using Handler = std::function<HttpReply(const HttpRequest&)>;

    /// Listens on a free TCP port of the loopback and on the Unix socket at `socketPath`; answers on a thread
    /// of its own.
    HttpServer(std::string socketPath, Handler handler);
    ~HttpServer();
    HttpServer(const HttpServer&) = delete;
    HttpServer& operator=(const HttpServer&) = delete;

    std::string url() const { return "http://127.0.0.1:" + std::to_string(port_); }
    const std::string& socketPath() const { return socketPath_; }

    /// All requests so far, the oldest first.
    std::vector<HttpRequest> requests() const;

private:
    void serve();
    void answer(int connection);
    void holdOpen(int connection);

    std::string socketPath_;
    Handler handler_;
    int port_ = 0;
    int tcp_ = -1;
    int unix_ = -1;
    int stop_ = -1;
    mutable std::mutex mutex_;
    std::vector<HttpRequest> requests_;
    std::thread thread_;
};

#endif

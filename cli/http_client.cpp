#include "cli/http_client.h"

#include "cli/failure.h"

#include <curl/curl.h>

#include <cerrno>
#include <cstring>
#include <new>

namespace velt::cli {

namespace {

constexpr std::size_t largestAnswer = std::size_t{64} * 1024 * 1024;
constexpr long connectSeconds = 10;

template<auto release> struct Release {
    template<class Object> void operator()(Object* object) const { release(object); }
};

/// Freed by the library's function.
template<class Object, auto release> using Owned = std::unique_ptr<Object, Release<release>>;

// What the callbacks of one transfer share. An exception must not pass through the C library.
struct Transfer {
    CURL* curl = nullptr;
    HttpAnswer answer;
    bool stopped = false;
    const std::function<bool(std::string_view)>* onText = nullptr;
    const std::function<bool()>* stop = nullptr;
    std::exception_ptr exception;
};

bool receive(Transfer& transfer, std::string_view text) {
    curl_easy_getinfo(transfer.curl, CURLINFO_RESPONSE_CODE, &transfer.answer.status);
    if (transfer.onText != nullptr && transfer.answer.status == 200) {
        transfer.stopped = !(*transfer.onText)(text);
        return !transfer.stopped;
    }
    if (transfer.answer.body.size() + text.size() > largestAnswer) {
        throw Failure(ExitCode::access, "The answer is too long to be from veltd.", checkAddress);
    }
    transfer.answer.body.append(text);
    return true;
}

std::size_t onData(char* data, std::size_t, std::size_t size, void* context) noexcept {
    auto& transfer = *static_cast<Transfer*>(context);
    try {
        return receive(transfer, {data, size}) ? size : 0;
    } catch (...) {
        transfer.exception = std::current_exception();
        return 0;
    }
}

int onProgress(void* context, curl_off_t, curl_off_t, curl_off_t, curl_off_t) noexcept {
    auto& transfer = *static_cast<Transfer*>(context);
    try {
        transfer.stopped = transfer.stopped || (transfer.stop != nullptr && (*transfer.stop)());
    } catch (...) {
        transfer.exception = std::current_exception();
        return 1;
    }
    return transfer.stopped ? 1 : 0;
}

/// Of the answer; "" when it has none of this name.
std::string headerOf(CURL* curl, const char* name) {
    curl_header* header = nullptr;
    return curl_easy_header(curl, name, 0, CURLH_HEADER, -1, &header) == CURLHE_OK ? header->value : "";
}

std::string hintFor(const ServerAddress& server, CURLcode code, long systemError) {
    if (code == CURLE_OPERATION_TIMEDOUT) {
        return "The request may still take effect: check 'veltctl status', or wait longer with --timeout.";
    }
    if (code == CURLE_PEER_FAILED_VERIFICATION || code == CURLE_SSL_CACERT_BADFILE) {
        return "Name the certificate that signed the server's with --ca-file.";
    }
    if (server.socket.empty()) {
        return "Check the address (--url or VELT_URL), and that veltd listens there.";
    }
    if (systemError == EACCES || systemError == EPERM) {
        return "Run veltctl as root or as a member of the group velt-admin.";
    }
    return "Start veltd, or say where it listens: at a Unix socket (--socket or VELT_SOCKET) or an address "
           "(--url or VELT_URL).";
}

Failure noAnswer(const ServerAddress& server, CURL* curl, CURLcode code, const char* detail) {
    long systemError = 0;
    curl_easy_getinfo(curl, CURLINFO_OS_ERRNO, &systemError);
    const bool connecting = code == CURLE_COULDNT_CONNECT && systemError != 0;
    std::string reason = *detail != '\0' ? detail : curl_easy_strerror(code);
    if (connecting) {
        reason = std::strerror(static_cast<int>(systemError));
    }
    return {ExitCode::access,
            (connecting ? "Cannot connect to " : "No answer from ") + server.name() + ": " + reason + ".",
            hintFor(server, code, systemError)};
}

} // namespace

struct HttpClient::Handle {
    Owned<CURL, curl_easy_cleanup> curl{curl_easy_init()};
    Owned<curl_slist, curl_slist_free_all> headers;
    Transfer transfer;
    char reason[CURL_ERROR_SIZE] = {};

    void addHeader(const std::string& line) {
        curl_slist* const longer = curl_slist_append(headers.get(), line.c_str());
        if (longer == nullptr) {
            throw std::bad_alloc();
        }
        (void)headers.release(); // part of the longer list, or its start
        headers.reset(longer);
    }
};

HttpClient::HttpClient(ServerAddress server)
    : server_(std::move(server)), handle_(std::make_unique<Handle>()) {
    if (handle_->curl == nullptr) {
        throw std::bad_alloc();
    }
}

HttpClient::~HttpClient() = default;

void HttpClient::prepare(const std::string& path) {
    CURL* const curl = handle_->curl.get();
    curl_easy_reset(curl); // keeps the connection
    handle_->headers.reset();
    handle_->transfer = Transfer{};
    handle_->transfer.curl = curl;
    handle_->reason[0] = '\0';

    curl_easy_setopt(curl, CURLOPT_URL, (server_.url + path).c_str());
    curl_easy_setopt(curl, CURLOPT_PROTOCOLS_STR, "http,https");
    // A proxy from the environment would see the token, and could not reach this machine's loopback.
    curl_easy_setopt(curl, CURLOPT_PROXY, "");
    curl_easy_setopt(curl, CURLOPT_NOSIGNAL, 1L);
    curl_easy_setopt(curl, CURLOPT_ERRORBUFFER, handle_->reason);
    curl_easy_setopt(curl, CURLOPT_CONNECTTIMEOUT, connectSeconds);
    curl_easy_setopt(curl, CURLOPT_WRITEFUNCTION, &onData);
    curl_easy_setopt(curl, CURLOPT_WRITEDATA, &handle_->transfer);
    if (!server_.socket.empty()) {
        curl_easy_setopt(curl, CURLOPT_UNIX_SOCKET_PATH, server_.socket.c_str());
    }
    if (!server_.caFile.empty()) {
        curl_easy_setopt(curl, CURLOPT_CAINFO, server_.caFile.c_str());
    }
    if (!server_.token.empty()) {
        handle_->addHeader("Authorization: Bearer " + server_.token);
    }
    handle_->addHeader("Expect:"); // which would cost a second round trip
}

void HttpClient::perform(bool mayBeStopped) {
    CURL* const curl = handle_->curl.get();
    Transfer& transfer = handle_->transfer;
    curl_easy_setopt(curl, CURLOPT_HTTPHEADER, handle_->headers.get());
    const CURLcode code = curl_easy_perform(curl);
    if (transfer.exception) {
        std::rethrow_exception(transfer.exception);
    }
    if (code != CURLE_OK && !(mayBeStopped && transfer.stopped)) {
        throw noAnswer(server_, curl, code, handle_->reason);
    }
    curl_easy_getinfo(curl, CURLINFO_RESPONSE_CODE, &transfer.answer.status);
    transfer.answer.etag = headerOf(curl, "ETag");
    transfer.answer.link = headerOf(curl, "Link");
}

HttpAnswer HttpClient::send(const std::string& method, const std::string& path,
                            const std::optional<std::string>& body, const std::string& ifMatch) {
    prepare(path);
    CURL* const curl = handle_->curl.get();
    curl_easy_setopt(curl, CURLOPT_TIMEOUT, static_cast<long>(server_.timeoutSeconds));
    handle_->addHeader("Accept: application/json, application/problem+json");
    if (!ifMatch.empty()) {
        handle_->addHeader("If-Match: " + ifMatch);
    }
    if (body) {
        handle_->addHeader("Content-Type: application/json");
        curl_easy_setopt(curl, CURLOPT_POSTFIELDSIZE_LARGE, static_cast<curl_off_t>(body->size()));
        curl_easy_setopt(curl, CURLOPT_POSTFIELDS, body->c_str());
    }
    if (method != "GET") {
        curl_easy_setopt(curl, CURLOPT_CUSTOMREQUEST, method.c_str());
    }
    perform(false);
    return handle_->transfer.answer;
}

HttpAnswer HttpClient::follow(const std::string& path, const std::function<bool(std::string_view)>& onText,
                              const std::function<bool()>& stop) {
    prepare(path);
    CURL* const curl = handle_->curl.get();
    handle_->addHeader("Accept: text/event-stream");
    handle_->transfer.onText = &onText;
    handle_->transfer.stop = &stop;
    curl_easy_setopt(curl, CURLOPT_NOPROGRESS, 0L);
    curl_easy_setopt(curl, CURLOPT_XFERINFOFUNCTION, &onProgress);
    curl_easy_setopt(curl, CURLOPT_XFERINFODATA, &handle_->transfer);
    perform(true);
    return handle_->transfer.answer;
}

std::string percentEncode(const std::string& text) {
    const Owned<char, curl_free> encoded(
        curl_easy_escape(nullptr, text.c_str(), static_cast<int>(text.size())));
    return encoded == nullptr ? throw std::bad_alloc() : std::string(encoded.get());
}

} // namespace velt::cli

// The server's methods as calls that return JSON values or throw Failure.
#ifndef VELT_CLI_API_CLIENT_H
#define VELT_CLI_API_CLIENT_H

#include "cli/http_client.h"

#include <json/value.h>

namespace velt::cli {

/// One method of one version of a web API.
struct ApiMethod {
    std::string api;
    int version = 1;
    std::string method;
};

/// An answer that is no JSON.
struct TextPage {
    std::string text;
    std::string next; ///< the path of the page behind it, as the server names it; "" for none
};

inline constexpr const char* chrootApi = "VELT.Core.FileServ.FTP.ChrootUser";

class ApiClient {
public:
    explicit ApiClient(ServerAddress server) : http_(std::move(server)) {}

    /// A method that takes no parameters and changes nothing.
    Json::Value read(const ApiMethod& method);

    /// Any method with its parameters; the query ("?dry_run=true") says how it is to change something. Null
    /// when the method answers without a value.
    Json::Value call(const ApiMethod& method, const Json::Value& parameters, const std::string& query = {});

    /// Runs `change`, which reads the settings and then calls a method that changes them. If others change
    /// something in between, the server refuses the call and `change` runs again from its start; Failure
    /// (conflict) when that happens too often.
    void changeWhatWasRead(const std::function<void()>& change);

    /// For the paths of the server that are not methods; `path` starts with a slash.
    Json::Value get(const std::string& path);
    TextPage getText(const std::string& path);
    Json::Value post(const std::string& path, const Json::Value& body);
    Json::Value patch(const std::string& path, const Json::Value& body);
    Json::Value remove(const std::string& path);

    /// As HttpClient::follow; an answer other than 200 is thrown.
    void follow(const std::string& path, const std::function<bool(std::string_view)>& onText,
                const std::function<bool()>& stop);

    const ServerAddress& server() const { return http_.server(); }

private:
    Json::Value exchange(const std::string& method, const std::string& path,
                         const std::optional<std::string>& body);

    HttpClient http_;
    bool watching_ = false; ///< within changeWhatWasRead
    std::string seen_;      ///< the state at its first read, or after its last call
};

} // namespace velt::cli

#endif

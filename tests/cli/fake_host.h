// The server's side of the API, with settings that can be read and changed, and scripted answers where a test
// wants them. A server answers from a thread of its own, and a client may be another process: the two are
// kept apart by a lock, which copies share.
#ifndef VELT_TESTS_CLI_FAKE_HOST_H
#define VELT_TESTS_CLI_FAKE_HOST_H

#include "tests/cli/http_server.h"

#include <json/value.h>

#include <map>
#include <memory>
#include <mutex>
#include <set>
#include <string>
#include <vector>

class FakeHost {
public:
    FakeHost();

    /// Answers as the server would: what answerWith() says comes first.
    HttpReply handle(const HttpRequest& request);

    /// From now on the request "METHOD /target" gets this answer.
    void answerWith(const std::string& request, HttpReply reply);

    // What the server holds. Not for use while a request runs.
    Json::Value ftp;
    Json::Value security;
    Json::Value sftp;
    Json::Value rules{Json::arrayValue};
    Json::Value chrootUsers{Json::arrayValue};
    std::set<std::string> accounts{"anna", "ben", "staff"};
    std::set<std::string> down; ///< services that are shown as off and are switched on: ftp, ftps, sftp
    std::string etag;           ///< of every answer; empty for none
    int outdated = 0;           ///< so many sets of the FTP settings come too late
    std::vector<std::string> conditions; ///< their If-Match
    bool tellsWanted = true;             ///< the status says what is switched on

private:
    HttpReply answer(const HttpRequest& request);
    HttpReply set(Json::Value& settings, const Json::Value& parameters,
                  const std::set<std::string>& required);
    Json::Value status() const;
    HttpReply saveRules(const Json::Value& parameters);
    HttpReply callMethod(const std::string& row, const Json::Value& parameters);

    std::shared_ptr<std::mutex> mutex_ = std::make_shared<std::mutex>();
    std::map<std::string, HttpReply> scripted_;
};

/// An application/problem+json answer with the members of the JSON text `problem`.
HttpReply problemReply(int status, const std::string& problem);

Json::Value jsonOf(const std::string& text);
std::string textOf(const Json::Value& value);

#endif

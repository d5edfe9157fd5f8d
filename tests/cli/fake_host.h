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
    Json::Value confinement;
    Json::Value sftp;
    Json::Value rules{Json::arrayValue};
    Json::Value chrootUsers{Json::arrayValue};
    std::set<std::string> accounts{"anna", "ben", "staff"};
    Json::Value report{Json::objectValue}; ///< what the answer to a change says beside the changes
    std::string etag;                      ///< of every answer; empty for none
    int outdated = 0;                      ///< so many changes come too late
    std::vector<std::string> conditions;   ///< their If-Match

private:
    HttpReply answer(const HttpRequest& request);
    Json::Value document() const;
    HttpReply patch(const std::string& target, const Json::Value& patch);
    HttpReply callMethod(const std::string& row);

    std::shared_ptr<std::mutex> mutex_ = std::make_shared<std::mutex>();
    std::map<std::string, HttpReply> scripted_;
};

/// An application/problem+json answer with the members of the JSON text `problem`.
HttpReply problemReply(int status, const std::string& problem);

Json::Value jsonOf(const std::string& text);
std::string textOf(const Json::Value& value);

#endif

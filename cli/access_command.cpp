#include "base/printable.h"
#include "cli/command.h"
#include "cli/json_io.h"
#include "cli/text_table.h"

#include <CLI/CLI.hpp>

#include <memory>
#include <ostream>
#include <string>

namespace velt::cli {

namespace {

struct AccessOptions {
    std::string user;
    std::string path;
};

/// "reading and writing" for the API's "write".
std::string wordsFor(const Json::Value& access) {
    const std::string word = access.asString();
    return word == "write" ? "read and write" : word == "read" ? "read only" : "nothing";
}

std::string sentences(const Json::Value& reasons) {
    std::string all;
    for (const Json::Value& reason : reasons) {
        all += (all.empty() ? "" : " ") + reason.asString();
    }
    return printable(all);
}

void writeFolders(std::ostream& out, const Json::Value& folders) {
    Table table({"SEEN AS", "ACCESS", "FOLDER", "WHY"});
    for (const Json::Value& seen : folders) {
        table.add({textAt(seen, "path"), wordsFor(seen["access"]), textAt(seen, "folder"),
                   sentences(seen["reasons"])});
        for (const Json::Value& within : seen["within"]) {
            table.add(
                {"", wordsFor(within["access"]), textAt(within, "folder"), "A share within it says so."});
        }
    }
    table.write(out);
}

void writeView(std::ostream& out, const std::string& service, const Json::Value& view) {
    out << service << ": " << sentences(view["reasons"]) << '\n';
    if (!view["allowed"].asBool()) {
        out << "The login would be refused: " << printable(view["refused"].asString()) << '\n';
        return;
    }
    if (view["whole_server"].asBool()) {
        return;
    }
    writeFolders(out, view["folders"]);
    for (const Json::Value& unseen : view["unseen_shares"]) {
        out << "Not seen: " << textAt(unseen, "share") << ". " << sentences(unseen["reasons"]) << '\n';
    }
    for (const Json::Value& remark : view["remarks"]) {
        out << printable(remark.asString()) << '\n';
    }
}

void writePath(std::ostream& out, const std::string& service, const Json::Value& seen) {
    out << service << ": " << wordsFor(seen["access"]);
    if (seen.isMember("path")) {
        out << ", as " << textAt(seen, "path");
    }
    out << ". " << printable(seen["reason"].asString()) << '\n';
}

void showAccess(Context& context, const AccessOptions& options) {
    std::string query = "/api/access?user=" + percentEncode(options.user);
    if (!options.path.empty()) {
        query += "&path=" + percentEncode(options.path);
    }
    const Json::Value answer = context.api.get(query);
    if (context.wroteJson(answer)) {
        return;
    }
    std::ostream& out = context.console.out;
    for (const auto& [service, key] : {std::pair("FTP", "ftp"), std::pair("SFTP", "sftp")}) {
        if (!answer.isMember(key)) {
            continue;
        }
        if (options.path.empty()) {
            writeView(out, service, answer[key]);
        } else {
            writePath(out, service, answer["path"][key]);
        }
    }
}

} // namespace

void addAccessCommand(CLI::App& app, Command& chosen) {
    auto options = std::make_shared<AccessOptions>();
    CLI::App* access =
        app.add_subcommand("access", "Show what a user sees and may do over FTP and SFTP, and why");
    access->add_option("user", options->user, "The user")->required()->type_name("");
    access->add_option("path", options->path, "A file or folder of the server; what the user may do with it")
        ->type_name("");
    onWords(access, chosen, [options](Context& context) { showAccess(context, *options); });
}

} // namespace velt::cli

#include "tests/cli/cli_test.h"

#include "cli/console.h"
#include "tests/support/files.h"

#include <CLI/CLI.hpp>

#include <fcntl.h>
#include <spawn.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cstdlib>
#include <sstream>
#include <stdexcept>

RunResult CliTest::run(const Words& words, const std::string& input) {
    std::istringstream in(input);
    std::ostringstream out;
    std::ostringstream err;
    velt::cli::Console console{in,
                               out,
                               err,
                               [this](const std::string& name) {
                                   const auto found = environment.find(name);
                                   return found == environment.end()
                                              ? std::nullopt
                                              : std::optional<std::string>(found->second);
                               },
                               [] {},
                               [this] {
                                   ++interruptionsAsked;
                                   return interrupted || (interrupt > 0 && interruptionsAsked >= interrupt);
                               },
                               [this] { return outputIsTerminal; }};
    const int code = static_cast<int>(velt::cli::runProgram(words, console));
    return {code, out.str(), err.str()};
}

std::vector<Json::Value> CliTest::sent(const std::string& request) const {
    std::vector<Json::Value> bodies;
    for (const HttpRequest& one : server.requests()) {
        if (one.method + " " + one.target == request) {
            bodies.push_back(jsonOf(one.body));
        }
    }
    return bodies;
}

std::vector<std::string> CliTest::asked() const {
    std::vector<std::string> lines;
    for (const HttpRequest& one : server.requests()) {
        lines.push_back(one.method + " " + one.target);
    }
    return lines;
}

namespace {

std::vector<char*> pointersOf(std::vector<std::string>& texts) {
    std::vector<char*> pointers;
    pointers.reserve(texts.size() + 1);
    for (std::string& text : texts) {
        pointers.push_back(text.data());
    }
    pointers.push_back(nullptr);
    return pointers;
}

} // namespace

RunResult runProcess(const std::vector<std::string>& arguments, const std::vector<std::string>& environment) {
    const TemporaryFolder folder;
    const std::string out = folder.write("out", "");
    const std::string err = folder.write("err", "");
    posix_spawn_file_actions_t actions;
    posix_spawn_file_actions_init(&actions);
    posix_spawn_file_actions_addopen(&actions, STDIN_FILENO, "/dev/null", O_RDONLY, 0);
    posix_spawn_file_actions_addopen(&actions, STDOUT_FILENO, out.c_str(), O_WRONLY, 0);
    posix_spawn_file_actions_addopen(&actions, STDERR_FILENO, err.c_str(), O_WRONLY, 0);
    std::vector<std::string> words = arguments;
    std::vector<std::string> variables = environment;
    pid_t child = -1;
    const int error = posix_spawn(&child, words.front().c_str(), &actions, nullptr, pointersOf(words).data(),
                                  pointersOf(variables).data());
    posix_spawn_file_actions_destroy(&actions);
    int status = 0;
    if (error != 0 || waitpid(child, &status, 0) != child) {
        throw std::runtime_error("cannot run " + words.front());
    }
    return {WIFEXITED(status) ? WEXITSTATUS(status) : 128 + WTERMSIG(status), velt::test::contentsOf(out),
            velt::test::contentsOf(err)};
}

namespace {

void describeBelow(const CLI::App& app, const std::string& words, std::vector<CommandDescription>& found) {
    CommandDescription description{words, {}};
    for (const CLI::Option* option : app.get_options()) {
        for (const std::string& name : option->get_lnames()) {
            description.options.push_back("--" + name);
        }
    }
    found.push_back(description);
    for (const CLI::App* child : app.get_subcommands([](const CLI::App*) { return true; })) {
        describeBelow(*child, words.empty() ? child->get_name() : words + " " + child->get_name(), found);
    }
}

} // namespace

std::vector<CommandDescription> describeCommands() {
    CLI::App app("", "veltctl");
    velt::cli::GlobalOptions options;
    velt::cli::Command command;
    velt::cli::addCommands(app, options, command);
    std::vector<CommandDescription> found;
    describeBelow(app, "", found);
    return found;
}

#include "cli/program.h"

#include <unistd.h>

#include <csignal>
#include <cstdlib>
#include <exception>
#include <iostream>

namespace {

volatile std::sig_atomic_t wasInterrupted = 0;

extern "C" void noteInterruption(int) {
    wasInterrupted = 1;
}

void watchInterruptions() {
    struct sigaction action {};
    action.sa_handler = noteInterruption;
    sigaction(SIGINT, &action, nullptr);
    sigaction(SIGTERM, &action, nullptr);
}

std::optional<std::string> environmentVariable(const std::string& name) {
    const char* const value = std::getenv(name.c_str());
    return value == nullptr ? std::nullopt : std::optional<std::string>(value);
}

} // namespace

int main(int argc, char** argv) {
    try {
        velt::cli::Console console{std::cin,
                                   std::cout,
                                   std::cerr,
                                   environmentVariable,
                                   watchInterruptions,
                                   [] { return wasInterrupted != 0; },
                                   [] { return isatty(STDOUT_FILENO) == 1; }};
        const std::vector<std::string> words(argv + 1, argv + argc);
        return static_cast<int>(velt::cli::runProgram(words, console));
    } catch (const std::exception& exception) {
        std::cerr << "veltctl: " << exception.what() << '\n';
        return static_cast<int>(velt::cli::ExitCode::local);
    }
}

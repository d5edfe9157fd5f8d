// A module that may be called by many threads: it watches whether reads and writes keep their order.

#include "platform/webapi.h"

#include <atomic>
#include <chrono>
#include <filesystem>
#include <fstream>
#include <string>
#include <thread>

namespace {

constexpr std::chrono::milliseconds pause{2};

// Two halves of one value: whoever sees them differ has seen half of a write. Nothing guards them here.
int firstHalf = 0;
int secondHalf = 0;

std::atomic<int> readers{0};
std::atomic<int> writers{0};
std::atomic<int> mostReaders{0};
std::atomic<int> mostWriters{0};
std::atomic<bool> mixed{false};
std::atomic<bool> torn{false};

void raise(std::atomic<int>& most, int value) {
    int seen = most;
    while (value > seen && !most.compare_exchange_weak(seen, value)) {
    }
}

void get(VELT::APIRequest*, VELT::APIResponse* response) {
    raise(mostReaders, ++readers);
    const int first = firstHalf;
    std::this_thread::sleep_for(pause);
    if (first != secondHalf) {
        torn = true;
    }
    if (writers > 0) {
        mixed = true;
    }
    --readers;
    Json::Value value(Json::objectValue);
    value["value"] = first;
    value["torn"] = torn.load();
    value["mixed"] = mixed.load();
    value["readers"] = mostReaders.load();
    value["writers"] = mostWriters.load();
    response->SetSuccess(value);
}

void set(VELT::APIRequest*, VELT::APIResponse* response) {
    raise(mostWriters, ++writers);
    if (readers > 0) {
        mixed = true;
    }
    ++firstHalf;
    std::this_thread::sleep_for(pause);
    ++secondHalf;
    --writers;
    response->SetSuccess(Json::Value());
}

/// Notes its beginning in a folder, and lasts until there is a file "go", or fails when nobody makes one.
void wait(VELT::APIRequest* request, VELT::APIResponse* response) {
    static std::atomic<int> calls{0};
    const std::filesystem::path folder = request->GetParam("folder", "").asString();
    const std::ofstream begun(folder / ("begun-" + std::to_string(++calls)));
    for (int i = 0; i < 12000 && !std::filesystem::exists(folder / "go"); ++i) {
        std::this_thread::sleep_for(std::chrono::milliseconds(5));
    }
    if (std::filesystem::exists(folder / "go")) {
        response->SetSuccess(Json::Value());
    } else {
        response->SetError(1902, Json::Value());
    }
}

const VELT::APITableRow table[] = {
    {"VELT.Test.Order", 1, "get", get},   {"VELT.Test.Order", 1, "set", set},
    {"VELT.Test.Order", 1, "wait", wait}, {"VELT.Test.Order", 1, "get_wait", wait},
    {nullptr, 0, nullptr, nullptr},
};

} // namespace

extern "C" __attribute__((visibility("default"))) const VELT::APITableRow* GetAPITable() {
    return table;
}

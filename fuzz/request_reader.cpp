// Requests of a connection: in one piece or in many, the reader must find the same ones.
#include "host/http/request_reader.h"

#include "fuzz/target.h"

#include <algorithm>
#include <cstring>
#include <vector>

namespace {

using velt::host::HttpRequest;
using velt::host::RequestReader;

/// What the reader made of the bytes, one text for each step.
using Steps = std::vector<std::string>;

constexpr std::size_t headLimit = 2048;
constexpr std::size_t bodyLimit = 4096;

std::string describe(const HttpRequest& request) {
    return request.method + '\n' + request.target + '\n' + request.host + '\n' + request.origin + '\n' +
           request.fetchSite + '\n' + request.authorization + '\n' + request.ifMatch + '\n' +
           (request.wellFormed ? "well" : "ill") + '\n' + request.body;
}

/// False when no more can be read from this connection.
bool takeSteps(RequestReader& reader, Steps& steps) {
    for (;;) {
        switch (reader.next()) {
        case RequestReader::Step::needMore:
            return true;
        case RequestReader::Step::head:
            steps.push_back("head\n" + describe(reader.request()));
            break;
        case RequestReader::Step::request:
            steps.push_back("request\n" + describe(reader.request()));
            if (!reader.keepAlive()) {
                return false;
            }
            reader.reset();
            break;
        case RequestReader::Step::refused:
            // Of several faults the first that is seen is told.
            steps.emplace_back("refused");
            return false;
        }
    }
}

Steps read(const std::string& bytes, std::size_t piece) {
    RequestReader reader(headLimit, bodyLimit);
    Steps steps;
    std::size_t at = 0;
    while (takeSteps(reader, steps) && at < bytes.size()) {
        const auto [place, room] = reader.space();
        velt::fuzz::check(room > 0, "there is room for more");
        const std::size_t size = std::min({room, piece, bytes.size() - at});
        std::memcpy(place, bytes.data() + at, size);
        reader.added(size);
        at += size;
    }
    return steps;
}

void checkSame(const Steps& pieces, const Steps& whole, const char* promise) {
    if (pieces != whole) {
        for (const Steps& steps : {whole, pieces}) {
            std::fprintf(stderr, "-- %zu steps\n", steps.size());
            for (const std::string& step : steps) {
                std::fprintf(stderr, "%s\n", step.c_str());
            }
        }
    }
    velt::fuzz::check(pieces == whole, promise);
}

/// Between two chunks the reader waits for the fewest bytes that could come, and so may see a fault later in
/// pieces than in one go: but no later than with these bytes more.
Steps readPieces(const std::string& bytes, std::size_t piece, const Steps& whole) {
    Steps steps = read(bytes, piece);
    const bool refusedLater = steps.size() + 1 == whole.size() && whole.back() == "refused";
    return refusedLater ? read(bytes + "xxxxx", piece) : steps;
}

} // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    if (size == 0) {
        return 0;
    }
    const std::string bytes = velt::fuzz::textOf(data + 1, size - 1);
    const Steps whole = read(bytes, SIZE_MAX);
    checkSame(readPieces(bytes, 1, whole), whole, "byte by byte, the same requests are read");
    checkSame(readPieces(bytes, 1 + data[0], whole), whole, "in pieces, the same requests are read");
    return 0;
}

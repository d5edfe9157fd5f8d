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
constexpr std::size_t room = 8192; ///< of the reader, at most

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
        const auto [place, space] = reader.space();
        velt::fuzz::check(space > 0, "there is room for more");
        const std::size_t size = std::min({space, piece, bytes.size() - at});
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

bool isWithoutRefusal(const Steps& steps, const Steps& others) {
    return steps.size() + 1 == others.size() && others.back() == "refused";
}

/// Between two chunks the reader waits for the fewest bytes that could come, and so may see a fault later in
/// pieces than in one go: but no later than with these bytes more.
Steps readPieces(const std::string& bytes, std::size_t piece, const Steps& whole) {
    Steps steps = read(bytes, piece);
    return isWithoutRefusal(steps, whole) ? read(bytes + "xxxxx", piece) : steps;
}

/// The quote of a chunk's extension that its line does not close is a fault once no more bytes are there, and
/// may still be closed while there are some: but the line fits into the reader's room or is refused.
Steps readWhole(const std::string& bytes, const Steps& pieces) {
    Steps steps = read(bytes, SIZE_MAX);
    return isWithoutRefusal(steps, pieces) ? read(bytes + std::string(room, 'x'), SIZE_MAX) : steps;
}

void checkSame(const std::string& bytes, std::size_t piece, const char* promise) {
    const Steps pieces = readPieces(bytes, piece, read(bytes, SIZE_MAX));
    checkSame(pieces, readWhole(bytes, pieces), promise);
}

} // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    if (size == 0) {
        return 0;
    }
    const std::string bytes = velt::fuzz::textOf(data + 1, size - 1);
    checkSame(bytes, 1, "byte by byte, the same requests are read");
    checkSame(bytes, 1 + data[0], "in pieces, the same requests are read");
    return 0;
}

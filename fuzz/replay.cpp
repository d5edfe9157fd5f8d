// Runs a target over the files of the folders and files that it is given, so that the inputs that are kept
// are ordinary tests, with any compiler. Fails when there are none.
#include "base/file.h"
#include "fuzz/target.h"

#include <algorithm>
#include <filesystem>
#include <vector>

namespace fs = std::filesystem;

namespace {

std::vector<fs::path> filesIn(const fs::path& path) {
    std::vector<fs::path> files;
    if (!fs::is_directory(path)) {
        files.push_back(path);
        return files;
    }
    for (const auto& entry : fs::recursive_directory_iterator(path)) {
        if (entry.is_regular_file()) {
            files.push_back(entry.path());
        }
    }
    std::ranges::sort(files);
    return files;
}

} // namespace

int main(int count, char** arguments) {
    int inputs = 0;
    for (int i = 1; i < count; ++i) {
        for (const fs::path& file : filesIn(arguments[i])) {
            const auto input = velt::readFile(file);
            if (!input) {
                std::fprintf(stderr, "%s\n", input.error().message.c_str());
                return EXIT_FAILURE;
            }
            // Should it crash, the last line names the input.
            std::fprintf(stderr, "%s\n", file.c_str());
            LLVMFuzzerTestOneInput(reinterpret_cast<const std::uint8_t*>(input->data()), input->size());
            ++inputs;
        }
    }
    std::printf("%d inputs\n", inputs);
    return inputs > 0 ? EXIT_SUCCESS : EXIT_FAILURE;
}

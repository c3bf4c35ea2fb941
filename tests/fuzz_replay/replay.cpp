// Runs a fuzz target over its seeds and a few thousand fixed mutations of them, where no fuzzer is at hand.
// Usage: <target>_replay [file...]: the files instead of the seeds, unmutated.

#include <algorithm>
#include <cstdint>
#include <cstdio>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <random>
#include <vector>

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size);

namespace {

using Input = std::vector<std::uint8_t>;

constexpr int kMutations = 4000;
constexpr std::size_t kLongest = 65536;

Input Run(const Input& input) {
    const Input exact(input); // capacity equals size, so that a sanitizer sees the end
    LLVMFuzzerTestOneInput(exact.data(), exact.size());
    return exact;
}

Input RunFile(const std::filesystem::path& path) {
    std::ifstream file(path, std::ios::binary);
    return Run(Input(std::istreambuf_iterator<char>(file), {}));
}

std::mt19937 g_random{1};
std::ptrdiff_t Below(std::size_t limit) { return g_random() % static_cast<std::uint32_t>(limit); }

void Mutate(Input& input, const Input& other) {
    const auto place = input.begin() + Below(input.size() + 1);
    const auto behind = place + std::min<std::ptrdiff_t>(input.end() - place, 1 + Below(8));
    const auto how = Below(4);
    if (how == 0 && place != behind) *place ^= static_cast<std::uint8_t>(1u << Below(8)); // flip a bit
    if (how == 1) input.insert(place, static_cast<std::uint8_t>(g_random()));             // a byte more
    if (how == 2) input.erase(place, behind);                                             // some bytes less
    if (how < 3) return;
    input.erase(place, input.end()); // the rest of another seed
    input.insert(input.end(), other.begin() + Below(other.size() + 1), other.end());
}

} // namespace

int main(int argc, char** argv) {
    for (int i = 1; i < argc; ++i) RunFile(argv[i]);
    if (argc > 1) return 0;
    std::vector<std::filesystem::path> paths;
    for (const auto& entry : std::filesystem::directory_iterator(TAVO_CORPUS)) paths.push_back(entry.path());
    std::sort(paths.begin(), paths.end());
    std::vector<Input> seeds;
    for (const auto& path : paths) seeds.push_back(RunFile(path));
    if (seeds.empty()) return 1;
    const auto any = [&]() -> const Input& { return seeds.at(static_cast<std::size_t>(Below(seeds.size()))); };
    for (int i = 0; i < kMutations; ++i) {
        Input input = any();
        for (auto times = 1 + Below(4); times; --times) Mutate(input, any());
        input.resize(std::min(input.size(), kLongest));
        Run(input);
    }
    std::printf("%zu seeds and %d mutations\n", seeds.size(), kMutations);
    return 0;
}

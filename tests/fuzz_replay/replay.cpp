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

Input ReadInput(const std::filesystem::path& path) {
    std::ifstream file(path, std::ios::binary);
    return Input(std::istreambuf_iterator<char>(file), {});
}

void Run(const Input& input) {
    const Input exact(input); // capacity equals size, so that a sanitizer sees the end
    LLVMFuzzerTestOneInput(exact.data(), exact.size());
}

class Mutator {
public:
    void Mutate(Input& input, const std::vector<Input>& seeds) {
        for (std::uint32_t times = 1 + Below(4); times; --times) MutateOnce(input, seeds);
        if (input.size() > kLongest) input.resize(kLongest);
    }
    std::uint32_t Below(std::size_t limit) { return limit ? m_random() % static_cast<std::uint32_t>(limit) : 0; }

private:
    void MutateOnce(Input& input, const std::vector<Input>& seeds) {
        const std::size_t at = Below(input.size() + 1), left = input.size() - at;
        const auto place = input.begin() + static_cast<std::ptrdiff_t>(at);
        const auto some = static_cast<std::ptrdiff_t>(std::min<std::size_t>(left, 1 + Below(8)));
        const auto random = static_cast<std::uint8_t>(m_random());
        switch (Below(6)) {
        case 0: // flip a bit
            if (left) *place ^= static_cast<std::uint8_t>(1u << Below(8));
            break;
        case 1: // another byte
            if (left) *place = random;
            break;
        case 2: // a byte more
            input.insert(place, random);
            break;
        case 3: // some bytes less
            input.erase(place, place + some);
            break;
        case 4: { // some bytes twice
            const Input copy(place, place + some);
            input.insert(place, copy.begin(), copy.end());
            break;
        }
        default: { // the rest of another seed
            const Input& other = seeds[Below(seeds.size())];
            const auto from = static_cast<std::ptrdiff_t>(Below(other.size() + 1));
            input.resize(at);
            input.insert(input.end(), other.begin() + from, other.end());
        }
        }
    }

    std::mt19937 m_random{1};
};

} // namespace

int main(int argc, char** argv) {
    for (int i = 1; i < argc; ++i) Run(ReadInput(argv[i]));
    if (argc > 1) return 0;

    std::vector<std::filesystem::path> paths;
    for (const auto& entry : std::filesystem::directory_iterator(TAVO_CORPUS))
        if (entry.is_regular_file()) paths.push_back(entry.path());
    std::sort(paths.begin(), paths.end());
    std::vector<Input> seeds;
    for (const auto& path : paths) seeds.push_back(ReadInput(path));
    if (seeds.empty()) {
        std::fprintf(stderr, "no seeds in %s\n", TAVO_CORPUS);
        return 1;
    }
    for (const Input& seed : seeds) Run(seed);
    Mutator mutator;
    for (int i = 0; i < kMutations; ++i) {
        Input input = seeds[mutator.Below(seeds.size())];
        mutator.Mutate(input, seeds);
        Run(input);
    }
    std::printf("%zu seeds and %d mutations\n", seeds.size(), kMutations);
    return 0;
}

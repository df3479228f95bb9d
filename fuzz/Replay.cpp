// Runs a target once for each file of some folders, in place of the fuzzer, which not every compiler has. So
// what the fuzzers once found is tested with every compiler.

#include <cstdint>
#include <cstdio>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <vector>

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size);

int main(int argc, char** argv) {
    int inputs = 0;
    for (int i = 1; i < argc; ++i) {
        for (const auto& file : std::filesystem::directory_iterator(argv[i])) {
            std::printf("%s\n", file.path().c_str());
            std::fflush(stdout); // a crash would lose what is still in the buffer
            std::ifstream stream(file.path(), std::ios::binary);
            const std::vector<char> input(std::istreambuf_iterator<char>(stream), {});
            LLVMFuzzerTestOneInput(reinterpret_cast<const std::uint8_t*>(input.data()), input.size());
            ++inputs;
        }
    }
    std::printf("%d inputs\n", inputs);
    return inputs > 0 ? 0 : 1;
}

#include <cstdint>
#include <cstdio>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <vector>

// Runs a fuzz target once over each file of the folders given: what a fuzzer has found stays a test on every
// machine and with every compiler.

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size);
extern "C" [[gnu::weak]] int LLVMFuzzerInitialize(int* count, char*** arguments);

int main(int count, char** arguments) {
  if (LLVMFuzzerInitialize) LLVMFuzzerInitialize(&count, &arguments);
  int inputs = 0;
  for (int i = 1; i < count; ++i)
    for (const auto& entry : std::filesystem::directory_iterator(arguments[i])) {
      std::ifstream file(entry.path(), std::ios::binary);
      const std::vector<char> bytes{std::istreambuf_iterator<char>(file), {}};
      LLVMFuzzerTestOneInput(reinterpret_cast<const std::uint8_t*>(bytes.data()), bytes.size());
      ++inputs;
    }
  std::printf("%d inputs\n", inputs);
  return inputs == 0;
}

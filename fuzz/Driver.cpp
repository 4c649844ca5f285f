// Runs a fuzz target with inputs made from a corpus: of what is changed at random, all that reaches
// new code is changed further. The target is one of libFuzzer's, and can be linked with that as
// well.
//
// Usage: PROGRAM [--seconds N] [--seed N] [--keep DIR] CORPUS...
//   --seconds N  how long, 0: the corpus alone (5)
//   --seed N     of the random numbers (1)
//   --keep DIR   where inputs that reach new code are written
// Ends with the line "N runs, N inputs, N places". What the sanitizers or the target find ends the
// program; the input is in DIR/last, or in ./fuzz-last.

#include <array>
#include <chrono>
#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <random>
#include <string>
#include <vector>

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size);

namespace {

namespace fs = std::filesystem;

constexpr size_t kPlaces = 1 << 16;
constexpr size_t kLongest = 20000;  ///< bytes of an input

std::array<uint8_t, kPlaces> hits;  ///< how often each pair of neighbouring places was passed
uintptr_t last = 0;

}  // namespace

/// The compiler has it called at each branch of the code under test.
extern "C" void __sanitizer_cov_trace_pc() {
  const uintptr_t place = reinterpret_cast<uintptr_t>(__builtin_return_address(0));
  uint8_t& count = hits[((place * 31) ^ last) % kPlaces];
  count = static_cast<uint8_t>(count < 255 ? count + 1 : 255);
  last = place;
}

namespace {

/// Counts as their powers of two: once more around a loop is nothing new.
uint8_t bucket(uint8_t count) {
  uint8_t bits = 0;
  for (; count > 0; count = static_cast<uint8_t>(count >> 1)) {
    bits = static_cast<uint8_t>(bits << 1 | 1);
  }
  return bits;
}

class Fuzzer {
 public:
  Fuzzer(unsigned seed, std::string keep) : random_(seed), keep_(std::move(keep)) {}

  void Add(const std::string& input) { Run(input); }
  void Mutate() {
    std::string input = pool_[random_() % pool_.size()];
    for (unsigned times = 1 + random_() % 4; times > 0; --times) {
      Change(input);
    }
    input.resize(std::min(input.size(), kLongest));
    Run(input);
  }
  void Report() const {
    size_t places = 0;
    for (const uint8_t seen : seen_) {
      places += seen != 0 ? 1 : 0;
    }
    printf("%zu runs, %zu inputs, %zu places\n", runs_, pool_.size(), places);
  }
  size_t Runs() const { return runs_; }

 private:
  void Run(const std::string& input) {
    const std::string last_file = keep_.empty() ? "fuzz-last" : keep_ + "/last";
    hits.fill(0);
    last = 0;
    current = input;
    current_file = last_file;
    LLVMFuzzerTestOneInput(reinterpret_cast<const uint8_t*>(input.data()), input.size());
    ++runs_;
    bool isNew = pool_.empty();
    for (size_t place = 0; place < kPlaces; ++place) {
      const uint8_t reached = bucket(hits[place]);
      isNew = isNew || (reached & ~seen_[place]) != 0;
      seen_[place] |= reached;
    }
    if (isNew) {
      pool_.push_back(input);
      if (!keep_.empty()) {
        std::ofstream(keep_ + "/" + std::to_string(pool_.size()), std::ios::binary) << input;
      }
    }
  }

  void Change(std::string& input) {
    static const char* const kWords[] = {"\r\n",
                                         "\r\n--B",
                                         "\r\n--B--",
                                         "--B\r\n",
                                         "\r\n\r\n",
                                         "filename=\"",
                                         "filename*=UTF-8''",
                                         "name=\"",
                                         "%22",
                                         "\\\"",
                                         "Content-Disposition: form-data; name=\"a\"",
                                         "boundary=",
                                         "\"",
                                         ";",
                                         "%0a",
                                         "--",
                                         "iso-8859-1''%E4"};
    const size_t at = input.empty() ? 0 : random_() % (input.size() + 1);
    switch (random_() % 7) {
      case 0:
        input.insert(at, kWords[random_() % std::size(kWords)]);
        break;
      case 1:
        input.insert(at, 1 + random_() % 3, static_cast<char>(random_()));
        break;
      case 2:
        input.erase(at, 1 + random_() % 16);
        break;
      case 3:
        if (at < input.size()) {
          input[at] = static_cast<char>(input[at] ^ 1 << random_() % 8);
        }
        break;
      case 4:
        input.insert(at, input.substr(random_() % (input.size() + 1), random_() % 64));
        break;
      case 5: {
        const std::string& other = pool_[random_() % pool_.size()];
        input = input.substr(0, at) + other.substr(random_() % (other.size() + 1));
        break;
      }
      default:
        if (random_() % 16 == 0) {
          input.insert(at, random_() % 9000, static_cast<char>(random_()));
        }
    }
  }

 public:
  static inline std::string current;
  static inline std::string current_file;

 private:
  std::mt19937 random_;
  std::string keep_;
  size_t runs_ = 0;
  std::vector<std::string> pool_;
  std::array<uint8_t, kPlaces> seen_{};
};

void writeCurrent() {
  std::ofstream(Fuzzer::current_file, std::ios::binary) << Fuzzer::current;
}

std::string contentOf(const fs::path& path) {
  std::ifstream file(path, std::ios::binary);
  return {std::istreambuf_iterator<char>(file), {}};
}

}  // namespace

#include <csignal>

int main(int argc, char** argv) {
  long seconds = 5;
  unsigned seed = 1;
  std::string keep;
  std::vector<fs::path> corpus;
  for (int at = 1; at < argc; ++at) {
    const std::string word = argv[at];
    const bool hasValue = at + 1 < argc;
    if (word == "--seconds" && hasValue) {
      seconds = atol(argv[++at]);
    } else if (word == "--seed" && hasValue) {
      seed = static_cast<unsigned>(atol(argv[++at]));
    } else if (word == "--keep" && hasValue) {
      keep = argv[++at];
    } else {
      corpus.emplace_back(word);
    }
  }
  signal(SIGABRT, [](int) {
    writeCurrent();
    signal(SIGABRT, SIG_DFL);
    raise(SIGABRT);
  });
  Fuzzer fuzzer(seed, keep);
  fuzzer.Add("");
  for (const fs::path& folder : corpus) {
    for (const auto& entry : fs::directory_iterator(folder)) {
      fuzzer.Add(contentOf(entry.path()));
    }
  }
  const auto end = std::chrono::steady_clock::now() + std::chrono::seconds(seconds);
  while (std::chrono::steady_clock::now() < end) {
    fuzzer.Mutate();
  }
  fuzzer.Report();
  return 0;
}

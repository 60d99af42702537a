// zdrgen --out DIR [--companies N] [--seed S] [--accounts N] [--documents N] [--lines-min N]
//        [--lines-max N] [--items N] [--ledger N] [--batches N] [--batch-size N]
//        [--receipts N] [--large]
// Writes one sample company into DIR, or with --companies N the folders company1..companyN.
#include <chrono>
#include <cstdio>
#include <cstdlib>
#include <exception>
#include <string>
#include <string_view>

#include "generator.h"

namespace {

constexpr const char* kUsage =
    "usage: zdrgen --out DIR [--companies N] [--seed S] [--accounts N] [--documents N]\n"
    "              [--lines-min N] [--lines-max N] [--items N] [--ledger N] [--batches N]\n"
    "              [--batch-size N] [--receipts N] [--large]\n";

[[noreturn]] void Usage(const std::string& why) {
  std::fprintf(stderr, "zdrgen: %s\n%s", why.c_str(), kUsage);
  std::exit(2);
}

uint64_t Number(std::string_view option, const char* text, uint64_t max) {
  std::string s(text);
  size_t used = 0;
  unsigned long long v = 0;
  try {
    if (s.empty() || s[0] == '-') throw std::invalid_argument("sign");
    v = std::stoull(s, &used, 10);
  } catch (const std::exception&) {
    used = 0;
  }
  if (used != s.size() || used == 0 || v > max) {
    Usage(std::string(option) + " needs a whole number from 0 to " + std::to_string(max) +
          ", not \"" + s + "\"");
  }
  return v;
}

}  // namespace

int main(int argc, char** argv) {
  zdrgen::Options opt;
  std::string out;
  int companies = 0;
  // --large first, so that the explicit sizes given with it win wherever they stand.
  for (int i = 1; i < argc; ++i) {
    if (std::string_view(argv[i]) == "--large") {
      uint64_t seed = opt.seed;
      opt = zdrgen::Options::Large();
      opt.seed = seed;
    }
  }
  const uint64_t kMaxCount = 10'000'000;
  for (int i = 1; i < argc; ++i) {
    std::string_view a = argv[i];
    if (a == "--large") continue;
    if (a == "--help" || a == "-h") {
      std::fputs(kUsage, stdout);
      return 0;
    }
    if (i + 1 >= argc) Usage("missing value after " + std::string(a));
    const char* v = argv[++i];
    auto count = [&] { return static_cast<int>(Number(a, v, kMaxCount)); };
    if (a == "--out") {
      out = v;
    } else if (a == "--companies") {
      companies = static_cast<int>(Number(a, v, 1000));
    } else if (a == "--seed") {
      opt.seed = Number(a, v, UINT64_MAX);
    } else if (a == "--accounts") {
      opt.accounts = count();
    } else if (a == "--documents") {
      opt.documents = count();
    } else if (a == "--lines-min") {
      opt.linesMin = static_cast<int>(Number(a, v, 255));
    } else if (a == "--lines-max") {
      opt.linesMax = static_cast<int>(Number(a, v, 255));
    } else if (a == "--items") {
      opt.items = count();
    } else if (a == "--ledger") {
      opt.ledger = count();
    } else if (a == "--batches") {
      opt.batches = static_cast<int>(Number(a, v, 32767 - 10));
    } else if (a == "--batch-size") {
      opt.batchSize = count();
    } else if (a == "--receipts") {
      opt.receipts = count();
    } else {
      Usage("unknown option " + std::string(a));
    }
  }
  if (out.empty()) Usage("--out is required");
  if (opt.linesMin > opt.linesMax) Usage("--lines-min is above --lines-max");
  // Keeping the truth of every generated record only serves tests; the command drops it.
  opt.keepDetail = false;

  try {
    auto start = std::chrono::steady_clock::now();
    if (companies > 0) {
      auto written = zdrgen::WriteCompanies(out, companies, opt);
      for (const auto& c : written) std::printf("%s\n", c.folder.string().c_str());
    } else {
      auto c = zdrgen::WriteCompany(out, opt, "מסחר ותעשייה");
      std::printf("%s\n", c.folder.string().c_str());
    }
    double seconds =
        std::chrono::duration<double>(std::chrono::steady_clock::now() - start).count();
    std::fprintf(stderr, "zdrgen: written in %.2f s\n", seconds);
  } catch (const std::exception& e) {
    std::fprintf(stderr, "zdrgen: %s\n", e.what());
    return 1;
  }
  return 0;
}

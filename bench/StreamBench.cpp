// Typed stream throughput: 10 million mixed values (long, short, IEEE
// double, short UString) written and read back through CFileStream and
// CHandleStream, against std::ofstream/std::ifstream doing the same
// big-endian encoding by hand. Prints times and ratios (ours / iostream);
// below 1 means ours is faster. Usage: bench_StreamBench [valueCount]

#include <algorithm>
#include <chrono>
#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <functional>
#include <string>
#include <vector>

#include "RatioReporter.h"
#include "tarn/Basics/Endian.h"
#include "tarn/FileSystem/FileSpecification.h"
#include "tarn/Streams/CFileStream.h"
#include "tarn/Streams/CHandleStream.h"
#include "tarn/String/UString.h"

using namespace tarn;

namespace {

std::vector<UString> Texts() {
  std::vector<UString> texts;
  for (const char* t :
       {"Kick", "Snare 2", "Hi-hat open", "Bass DI", "Vox", "Room L", "Room R", "Strings (div.)"}) {
    texts.emplace_back(t);
  }
  return texts;
}

// The value sequence: i % 4 picks long, short, double or text.
template <class Writer>
void WriteValues(std::int64_t count, const std::vector<UString>& texts, Writer&& w) {
  for (std::int64_t i = 0; i < count; ++i) {
    switch (i & 3) {
      case 0:
        w.Long(static_cast<int>(i * 2654435761u));
        break;
      case 1:
        w.Short(static_cast<short>(i));
        break;
      case 2:
        w.Double(static_cast<double>(i) * 0.25);
        break;
      default:
        w.Text(texts[static_cast<std::size_t>(i >> 2) & 7]);
        break;
    }
  }
}

// Reads the sequence back and folds it into a checksum.
template <class Reader>
std::uint64_t ReadValues(std::int64_t count, Reader&& r) {
  std::uint64_t sum = 0;
  UString text;
  for (std::int64_t i = 0; i < count; ++i) {
    switch (i & 3) {
      case 0:
        sum += static_cast<std::uint32_t>(r.Long());
        break;
      case 1:
        sum += static_cast<std::uint16_t>(r.Short());
        break;
      case 2:
        sum += static_cast<std::uint64_t>(r.Double());
        break;
      default:
        r.Text(text);
        sum += text.length();
        break;
    }
  }
  return sum;
}

struct StreamWriter {
  CStream& s;
  void Long(int v) { s.PutLong(v); }
  void Short(short v) { s.PutShort(v); }
  void Double(double v) { s.PutIEEEDouble(v); }
  void Text(const UString& t) { s.PutUString(t); }
};

struct StreamReader {
  CStream& s;
  int Long() { return s.GetLong(); }
  short Short() { return s.GetShort(); }
  double Double() { return s.GetIEEEDouble(); }
  void Text(UString& t) { s.GetUString(t); }
};

struct IostreamWriter {
  std::ofstream& f;
  template <class T>
  void Put(T v) {
    const T big = Endian::Swapped(v);
    f.write(reinterpret_cast<const char*>(&big), sizeof big);
  }
  void Long(int v) { Put(v); }
  void Short(short v) { Put(v); }
  void Double(double v) { Put(v); }
  void Text(const UString& t) {
    const std::string utf8 = t.utf8_str();
    Put(static_cast<int>(utf8.size()));
    f.write(utf8.data(), static_cast<std::streamsize>(utf8.size()));
  }
};

struct IostreamReader {
  std::ifstream& f;
  std::string bytes;
  template <class T>
  T Get() {
    T big{};
    f.read(reinterpret_cast<char*>(&big), sizeof big);
    return Endian::Swapped(big);
  }
  int Long() { return Get<int>(); }
  short Short() { return Get<short>(); }
  double Double() { return Get<double>(); }
  void Text(UString& t) {
    const int n = Get<int>();
    bytes.assign(static_cast<std::size_t>(n), '\0');
    f.read(bytes.data(), n);
    t = UString(bytes.data(), bytes.size(), UString::kUTF8Encoding);
  }
};

double Seconds(const std::function<void()>& work) {
  double best = 1e30;
  for (int round = 0; round < 3; ++round) {
    const auto start = std::chrono::steady_clock::now();
    work();
    const std::chrono::duration<double> took = std::chrono::steady_clock::now() - start;
    best = std::min(best, took.count());
  }
  return best;
}

}  // namespace

int main(int argc, char** argv) {
  const std::int64_t count = argc > 1 ? std::atoll(argv[1]) : 10'000'000;
  const std::vector<UString> texts = Texts();
  const auto path = std::filesystem::temp_directory_path() / "tarn_stream_bench.bin";
  const auto utf8Path = path.u8string();
  const FileSpecification spec(UString(reinterpret_cast<const char*>(utf8Path.c_str())));
  std::uint64_t sumOurs = 0, sumHandle = 0, sumPeer = 0;

  const double fileWrite = Seconds([&] {
    CFileStream s(spec);
    s.Open(kTCLWriteMode);
    WriteValues(count, texts, StreamWriter{s});
    s.Close();
  });
  const double fileRead = Seconds([&] {
    CFileStream s(spec);
    s.Open(kTCLReadMode);
    sumOurs = ReadValues(count, StreamReader{s});
  });
  const auto fileSize = std::filesystem::file_size(path);

  CHandleStream handle(kTCLReadWriteMode);
  const double handleWrite = Seconds([&] {
    handle.Truncate(0);
    WriteValues(count, texts, StreamWriter{handle});
  });
  const double handleRead = Seconds([&] {
    handle.MoveTo(0);
    sumHandle = ReadValues(count, StreamReader{handle});
  });

  const double peerWrite = Seconds([&] {
    std::ofstream f(path, std::ios::binary | std::ios::trunc);
    WriteValues(count, texts, IostreamWriter{f});
  });
  const double peerRead = Seconds([&] {
    std::ifstream f(path, std::ios::binary);
    sumPeer = ReadValues(count, IostreamReader{f, {}});
  });
  std::filesystem::remove(path);

  if (sumOurs != sumPeer || sumHandle != sumPeer) {
    std::printf("checksums differ: %llu %llu %llu\n", static_cast<unsigned long long>(sumOurs),
                static_cast<unsigned long long>(sumHandle),
                static_cast<unsigned long long>(sumPeer));
    return 1;
  }
  std::printf(
      "%lld mixed values (long, short, IEEE double, short UString), %llu bytes, best of 3\n",
      static_cast<long long>(count), static_cast<unsigned long long>(fileSize));
  std::printf("%-34s %9s %9s\n", "", "write s", "read s");
  std::printf("%-34s %9.3f %9.3f\n", "CFileStream", fileWrite, fileRead);
  std::printf("%-34s %9.3f %9.3f\n", "CHandleStream", handleWrite, handleRead);
  std::printf("%-34s %9.3f %9.3f\n", "std::ofstream/ifstream + swapping", peerWrite, peerRead);
  std::printf("ratio CFileStream / iostream:   write %.2f  read %.2f\n", fileWrite / peerWrite,
              fileRead / peerRead);
  std::printf("ratio CHandleStream / iostream: write %.2f  read %.2f\n", handleWrite / peerWrite,
              handleRead / peerRead);
  tarn_bench::PrintRatio("CFileStreamWrite", "iostream", fileWrite / peerWrite);
  tarn_bench::PrintRatio("CFileStreamRead", "iostream", fileRead / peerRead);
  tarn_bench::PrintRatio("CHandleStreamWrite", "iostream", handleWrite / peerWrite);
  tarn_bench::PrintRatio("CHandleStreamRead", "iostream", handleRead / peerRead);
  return 0;
}

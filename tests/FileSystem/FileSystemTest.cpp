// Paths and unique names, the extension table, files on disk
// (creation, errors with system codes, non-ASCII names, dates, forks).

#include <gtest/gtest.h>

#include <fstream>
#include <iterator>

#include "FsTestSupport.h"
#include "tarn/Errors/Fail.h"
#include "tarn/FileSystem/File.h"
#include "tarn/FileSystem/FileTypes.h"

namespace {

using tarn::File;
using tarn::FileDate;
using tarn::FileSpecification;
using tarn::FileTypeClass;
using tarn::UString;
using tarntest::U;

UString Repeat(char c, std::size_t n) { return U(std::string(n, c).c_str()); }

class FileSystemTest : public tarntest::TempFolderTest {
 protected:
  std::string ReadAll(const File& f) const {
    std::ifstream in(tarntest::ToPath(f.GetSpecification().GetFullPath()), std::ios::binary);
    return std::string(std::istreambuf_iterator<char>(in), {});
  }
  void WriteAll(std::FILE* fp, const std::string& s) const {
    ASSERT_EQ(std::fwrite(s.data(), 1, s.size(), fp), s.size());
    File::CloseFork(fp);
  }
  // Checks that `f` throws the platform's error `code` about `name`.
  template <class F>
  void ExpectSystemError(F&& f, int code, const char* name) const {
    tarntest::ExpectError(f, tarntest::SystemKind(), code, In(U(name)).GetFullPath());
  }
};

TEST_F(FileSystemTest, NamesKindsAndMissingFiles) {
  MakeFile(U("a.wav"));
  MakeFolder(U("sub"));
  const FileSpecification file = In(U("a.wav"));
  EXPECT_EQ(file.GetParentFolder(), folder_);
  EXPECT_TRUE(file.IsFile() && !file.IsFolder());
  EXPECT_TRUE(In(U("sub")).IsFolder() && !In(U("sub")).IsFile());
  const UString missing = In(U("none")).GetFullPath();
  EXPECT_NO_THROW(FileSpecification(missing, tarn::kMissingFileSpecAllowed));
  tarntest::ExpectError([&] { FileSpecification(missing, tarn::kMissingFileSpecFails); }, "OS", -43,
                        In(U("none")).GetDisplayPath());
  tarntest::ExpectError([&] { tarn::FailFSErr(-48, In(U("x")), In(U("y"))); }, "OS", -48,
                        In(U("x")).GetDisplayPath() + U("\n") + In(U("y")).GetDisplayPath());
}

// Each row: files and folders on disk, the name to make unique, the mode,
// and the name chosen.
TEST_F(FileSystemTest, MakeUniqueSkipsTakenNamesOfItsKind) {
  using tarn::kMakeUniqueAnything, tarn::kMakeUniqueFile, tarn::kMakeUniqueFolder;
  const struct {
    std::vector<const char*> files, folders;
    const char* name;
    tarn::MakeUniqueMode mode;
    const char* expected;
  } rows[] = {
      {{"Take.wav", "Take 2.wav"}, {}, "Take.wav", kMakeUniqueAnything, "Take 3.wav"},
      {{"Take"}, {}, "Take", kMakeUniqueAnything, "Take 2"},
      {{"a.b.wav"}, {}, "a.b.wav", kMakeUniqueAnything, "a.b 2.wav"},
      {{}, {"Take.wav"}, "Take.wav", kMakeUniqueFile, "Take.wav"},
      {{}, {"Take.wav"}, "Take.wav", kMakeUniqueAnything, "Take 2.wav"},
      {{"Dir"}, {}, "Dir", kMakeUniqueFolder, "Dir"},
      {{"Dir"}, {}, "Dir", kMakeUniqueFile, "Dir 2"},
      {{"Song.wav"}, {"Song 2.wav"}, "Song.wav", kMakeUniqueFile, "Song 2.wav"},
  };
  for (const auto& row : rows) {
    SCOPED_TRACE(row.name);
    std::filesystem::remove_all(dir_);
    std::filesystem::create_directories(dir_);
    for (const char* f : row.files) MakeFile(U(f));
    for (const char* f : row.folders) MakeFolder(U(f));
    FileSpecification s = In(U(row.name));
    s.MakeUnique(row.mode);
    EXPECT_EQ(s.GetName(), U(row.expected));
  }
  MakeFile(U("Mix.1.wav"));
  FileSpecification s = In(U("Mix.1"));
  s.MakeUniqueAddingExtension(U(".wav"));
  EXPECT_EQ(s.GetName(), U("Mix.1 2.wav"));
}

TEST(MakeUniqueCandidate, CutsBaseToKeepWithin255Units) {
  const UString base = Repeat('a', 252);
  EXPECT_EQ(FileSpecification::MakeUniqueCandidate(base, U(".wav"), 2),
            Repeat('a', 249) + U(" 2.wav"));
  EXPECT_EQ(FileSpecification::MakeUniqueCandidate(U(""), U(""), 7), U(" 7"));
  for (unsigned n : {2u, 9u, 10u, 99u, 100u, 123456u}) {
    for (std::size_t extLen : {0u, 4u, 250u, 252u, 253u, 254u, 300u}) {
      const UString name = FileSpecification::MakeUniqueCandidate(base, Repeat('e', extLen), n);
      EXPECT_LE(name.length(), 255u) << n << " " << extLen;
      EXPECT_NE(name.find(U(std::to_string(n).c_str())), UString::npos) << n << " " << extLen;
    }
  }
  // 248 'a' + U+1F3B5 (two units) = 250 units; room for 249 would split it.
  UString pair = Repeat('a', 248);
  pair += 0x1F3B5u;
  EXPECT_EQ(FileSpecification::MakeUniqueCandidate(pair, U(".wav"), 2),
            Repeat('a', 248) + U(" 2.wav"));
}

TEST_F(FileSystemTest, LongNamesOnDiskBecomeUniqueWithin255) {
  // The extension leaves no room for a base: the name is still made valid.
  const UString dotName = U(".") + Repeat('e', 253);  // 254 units, all "extension"
  MakeFile(dotName);
  FileSpecification d = In(dotName);
  d.MakeUnique();
  const tarn::File created = tarn::File::CreateOnDisk(In(dotName), "TEXT", 0, tarn::kAdjustName);
  EXPECT_EQ(created.GetSpecification(), d);
  EXPECT_TRUE(d.IsFile());
}

TEST_F(FileSystemTest, CreateOnDiskAndDemandOnDisk) {
  const File f = File::CreateOnDisk(In(U("Take.wav")), "WAVE", "????");
  EXPECT_EQ(f.GetFileDataSize(), 0);
  WriteAll(f.Open("wb"), "data");
  ExpectSystemError([&] { (void)File::CreateOnDisk(In(U("Take.wav")), "WAVE", 0); },
                    tarntest::ExistsCode(), "Take.wav");
  EXPECT_EQ(ReadAll(f), "data") << "the failed creation left the file alone";
  MakeFile(U("Take 2.wav"));
  const File g = File::CreateOnDisk(In(U("Take.wav")), "WAVE", 0, tarn::kAdjustName);
  EXPECT_EQ(g.GetSpecification().GetName(), U("Take 3.wav"));
  WriteAll(File::DemandOnDisk(In(U("a.aif")), "AIFF", 0).Open("wb"), "xyz");
  EXPECT_EQ(ReadAll(File::DemandOnDisk(In(U("a.aif")), "AIFF", 0)), "xyz");
  MakeFolder(U("d.aif"));
  EXPECT_THROW((void)File::DemandOnDisk(In(U("d.aif")), "AIFF", 0), tarn::TarnError);
}

TEST_F(FileSystemTest, OpenModesAndFailures) {
  const File f(In(U("f.raw")));
  ExpectSystemError([&] { (void)f.Open("rb"); }, tarntest::NotFoundCode(), "f.raw");
  WriteAll(f.Open("wb"), "0123456789");
  EXPECT_EQ(f.GetFileDataSize(), 10);
  EXPECT_TRUE(f.CanWriteToFile() && !File(In(U("h.raw"))).CanWriteToFile());
  WriteAll(f.OpenDataFork(tarn::kReadWritePermission), "Z");  // no truncation
  EXPECT_EQ(ReadAll(f), "Z123456789");
  const File g(In(U("g.raw")));
  WriteAll(g.OpenDataFork(tarn::kWritePermission), "new");  // created when missing
  EXPECT_EQ(g.GetFileDataSize(), 3);
  ExpectSystemError([&] { (void)File(In(U("h.raw"))).OpenDataFork(tarn::kReadPermission); },
                    tarntest::NotFoundCode(), "h.raw");
}

TEST_F(FileSystemTest, NonASCIINamesRoundTrip) {
  const UString name = U(u8"Grüße_日本_\U0001F3B5.wav");
  const File f = File::CreateOnDisk(In(name), "WAVE", 0);
  WriteAll(f.Open("wb"), "RIFF");
  const std::filesystem::directory_iterator listing(dir_);
  EXPECT_EQ(tarntest::ToU(listing->path().filename()), name);
  EXPECT_EQ(FileSpecification(tarntest::ToU(listing->path())), In(name));
  EXPECT_EQ(ReadAll(File(In(name))), "RIFF");
  FileSpecification taken = In(name);
  taken.MakeUnique();
  EXPECT_EQ(taken.GetName(), U(u8"Grüße_日本_\U0001F3B5 2.wav"));
}

TEST_F(FileSystemTest, ModificationDateRoundTrips) {
  const FileDate now = FileDate::Now();
  const File f = File::CreateOnDisk(In(U("dated.wav")), "WAVE", 0);
  EXPECT_LT(now.GetNanoseconds(), 1'000'000'000u);
  EXPECT_NEAR(static_cast<double>(f.GetModificationDate().GetSeconds()),
              static_cast<double>(now.GetSeconds()), 5.0)
      << "a new file is dated now";
  for (const FileDate& d : {FileDate(1'600'000'000, 123'456'700), FileDate(0, 0),
                            FileDate(4'102'444'800, 999'999'900)}) {  // 2100-01-01
    f.SetModificationDate(d);
    const FileDate back = f.GetModificationDate();
    EXPECT_EQ(back.GetSeconds(), d.GetSeconds());
    EXPECT_EQ(back.GetNanoseconds(), d.GetNanoseconds());
  }
  ExpectSystemError([&] { (void)FileDate::Get(In(U("none"))); }, tarntest::NotFoundCode(), "none");
  ExpectSystemError([&] { FileDate::Set(In(U("none")), FileDate(1, 0)); }, tarntest::NotFoundCode(),
                    "none");
}

TEST_F(FileSystemTest, ResourceForkIsSeparateFromDataAndTravelsWithTheFile) {
  File f = File::CreateResFileOnDisk(In(U("r.sd2")), "Sd2f", 0);
  WriteAll(f.Open("wb"), "DATA12");
  WriteAll(f.OpenResourceFork(tarn::kWritePermission), "RSRC");
  EXPECT_EQ(f.GetFileDataSize(), 6);
  EXPECT_EQ(f.GetFileResourceSize(), 4);
  EXPECT_EQ(f.GetFileTotalSize(), 10);
  EXPECT_EQ(File::ResourceForkPath(f.GetSpecification().GetFullPath()),
            f.GetSpecification().GetFullPath() + U(":AFP_Resource"));
  f.Rename(U("renamed.sd2"));
  EXPECT_EQ(f.GetFileResourceSize(), 4);
  f.Delete();
  EXPECT_TRUE(std::filesystem::is_empty(dir_)) << "the fork goes with the file";
}

TEST_F(FileSystemTest, RenameMoveReplaceDelete) {
  File a = File::CreateOnDisk(In(U("a.wav")), "WAVE", 0);
  WriteAll(a.Open("wb"), "A");
  File target = File::CreateOnDisk(In(U("b.wav")), "WAVE", 0);
  tarntest::ExpectError([&] { a.Rename(U("b.wav")); }, tarntest::SystemKind(),
                        tarntest::RenameExistsCode(),
                        In(U("a.wav")).GetFullPath() + U("\n") + In(U("b.wav")).GetFullPath());
  MakeFolder(U("sub"));
  a.MoveTo(In(U("sub")), U(u8"moved é.wav"));
  target.ReplaceContents(a);
  EXPECT_EQ(ReadAll(target), "A");
  EXPECT_FALSE(a.GetSpecification().Exists());
  target.Delete();
  ExpectSystemError([&] { target.Delete(); }, tarntest::NotFoundCode(), "b.wav");
}

TEST(FileTypes, NameToTypeFollowsFirstMatchingRow) {
  const struct {
    const char* name;
    FileTypeClass type;
  } cases[] = {
      {"Take", tarn::kNoExtensionFileType},  // no dot at all
      {"Take.", "MooV"},                     // the empty extension meets "MooV"'s empty second one
      {"Take.wav", "WAVE"},                  // not ".WAV", ".wav" or "PNRA" further down
      {"Take.WAV", "WAVE"},
      {"Take.bwf", "WAVE"},
      {"Take.w64", ".W64"},
      {"Take.aif", "AIFF"},
      {"Take.mp3", "MPG3"},  // first of seven mp3 rows
      {"Take.caf", "caff"},  // lower-case row comes first
      {"Take.grv", "scGR"},  // before the zero-led groove row
      {"Take.groove", 0x00477276},
      {"a.b.dig", "SFIL"},  // only the last extension counts
      {"Take.nosuch", 0},
      {"Take.wav.gz", 0},
  };
  for (const auto& c : cases) {
    SCOPED_TRACE(c.name);
    EXPECT_EQ(tarn::FileTypeFromName(U(c.name)).GetCode(), c.type.GetCode());
  }
}

TEST(FileTypes, TypeToExtensionsStopsAtFirstRow) {
  const struct {
    FileTypeClass type;
    std::vector<tarn::UString> extensions;
  } rows[] = {
      {"WAVE", {U("wav"), U("wave")}},  // never "bwf"
      {"MPEG", {U("mpg"), U("mpeg")}},       {"MooV", {U("mov")}},
      {0x00477276, {U("grv"), U("groove")}}, {"None", {}},
  };
  for (const auto& row : rows) {
    std::vector<tarn::UString> list{U("stale")};
    EXPECT_EQ(tarn::FileTypeToExtensionList(row.type, list), !row.extensions.empty());
    EXPECT_EQ(list, row.extensions);
    tarn::UString first = U("stale");
    EXPECT_EQ(tarn::FileTypeToExtension(row.type, first), !row.extensions.empty());
    EXPECT_EQ(first, row.extensions.empty() ? tarn::UString() : row.extensions.front());
  }
}

TEST(FileTypes, RegisteredTypesAreSearchedFirst) {
  FileTypeClass type;
  ASSERT_TRUE(tarn::ExtensionToFileType(U("tmix"), type));
  EXPECT_EQ(type, FileTypeClass("TrnM"));
  tarn::RegisterFileType("Rgs1", {U("zqx"), U("tmix")});
  tarn::RegisterFileType("Rgs2", {U("ZQX")});  // later entry: never reached for zqx
  EXPECT_TRUE(tarn::ExtensionToFileType(U("TMIX"), type));
  EXPECT_EQ(type, FileTypeClass("Rgs1"));
  EXPECT_EQ(tarn::FileTypeFromName(U("x.Zqx")), FileTypeClass("Rgs1"));
  std::vector<tarn::UString> list;
  EXPECT_TRUE(tarn::FileTypeToExtensionList("Rgs1", list));
  EXPECT_EQ(list, (std::vector<tarn::UString>{U("zqx"), U("tmix")}));
}

}  // namespace

#include "tarn/FileSystem/File.h"

#include <gtest/gtest.h>

#include <fstream>
#include <iterator>

#include "FsTestSupport.h"
#include "tarn/Errors/Fail.h"

namespace {

using tarn::File;
using tarn::FileDate;
using tarn::FileSpecification;
using tarn::UString;
using tarntest::U;

class FileTest : public tarntest::TempFolderTest {
 protected:
  std::string ReadAll(const File& f) const {
    std::FILE* fp = f.Open("rb");
    std::string s;
    char buf[256];
    for (std::size_t n; (n = std::fread(buf, 1, sizeof buf, fp)) > 0;) s.append(buf, n);
    File::CloseFork(fp);
    return s;
  }
  void WriteAll(std::FILE* fp, const std::string& s) const {
    ASSERT_EQ(std::fwrite(s.data(), 1, s.size(), fp), s.size());
    File::CloseFork(fp);
  }
};

// Runs `f` and checks that it throws the platform's error with `code`.
template <class F>
void ExpectSystemError(F&& f, int code, const UString& attachment) {
  try {
    f();
    ADD_FAILURE() << "no throw";
  } catch (const tarn::TarnError& e) {
    EXPECT_EQ(e.GetKind(), tarntest::SystemKind());
    EXPECT_EQ(e.GetIntErrorCode(), code);
    ASSERT_TRUE(e.GetAttachment().has_value());
    EXPECT_EQ(*e.GetAttachment(), attachment);
  }
}

TEST_F(FileTest, CreateOnDiskMakesANewEmptyFileOnly) {
  const FileSpecification spec = In(U("Take.wav"));
  const File f = File::CreateOnDisk(spec, "WAVE", "????");
  EXPECT_EQ(f.GetSpecification(), spec);
  EXPECT_TRUE(spec.IsFile());
  EXPECT_EQ(f.GetFileDataSize(), 0);
  WriteAll(f.Open("wb"), "data");
  ExpectSystemError([&] { (void)File::CreateOnDisk(spec, "WAVE", 0); }, tarntest::ExistsCode(),
                    spec.GetFullPath());
  EXPECT_EQ(ReadAll(f), "data");  // the failed creation left the file alone
  MakeFolder(U("Dir"));
  ExpectSystemError([&] { (void)File::CreateOnDisk(In(U("Dir")), 0, 0); }, tarntest::ExistsCode(),
                    In(U("Dir")).GetFullPath());
}

TEST_F(FileTest, CreateOnDiskWithAdjustNameTakesTheNextFreeName) {
  MakeFile(U("Take.wav"));
  MakeFile(U("Take 2.wav"));
  const File f = File::CreateOnDisk(In(U("Take.wav")), "WAVE", 0, tarn::kAdjustName);
  EXPECT_EQ(f.GetSpecification().GetName(), U("Take 3.wav"));
  EXPECT_TRUE(In(U("Take 3.wav")).IsFile());
  const File g = File::CreateOnDisk(In(U("New.wav")), "WAVE", 0, tarn::kAdjustName);
  EXPECT_EQ(g.GetSpecification().GetName(), U("New.wav"));
}

TEST_F(FileTest, DemandOnDiskCreatesOrReusesButRefusesFolders) {
  const File a = File::DemandOnDisk(In(U("a.aif")), "AIFF", 0);
  EXPECT_TRUE(In(U("a.aif")).IsFile());
  WriteAll(a.Open("wb"), "xyz");
  const File again = File::DemandOnDisk(In(U("a.aif")), "AIFF", 0);
  EXPECT_EQ(ReadAll(again), "xyz");
  MakeFolder(U("d.aif"));
  try {
    (void)File::DemandOnDisk(In(U("d.aif")), "AIFF", 0);
    FAIL() << "no throw";
  } catch (const tarn::TarnError& e) {
    EXPECT_TRUE(tarn::IsFileSystemError(e));
    EXPECT_EQ(*e.GetAttachment(), In(U("d.aif")).GetDisplayPath());
  }
}

TEST_F(FileTest, TypeComesFromTheExtension) {
  EXPECT_EQ(File(In(U("x.WAV"))).GetType(), tarn::FileTypeClass("WAVE"));
  EXPECT_EQ(File(In(U("x."))).GetType(), tarn::FileTypeClass("MooV"));
  EXPECT_EQ(File(In(U("x"))).GetType().GetCode(), 0x20575446u);
  EXPECT_EQ(File(In(U("x.q9z"))).GetType().GetCode(), 0u);
  EXPECT_EQ(File(In(U("x.bwf"))).GetCreator().GetCode(), 0u);
}

TEST_F(FileTest, OpenModesAndFailures) {
  const File f(In(U("f.raw")));
  ExpectSystemError([&] { (void)f.Open("rb"); }, tarntest::NotFoundCode(),
                    f.GetSpecification().GetFullPath());
  EXPECT_FALSE(f.CanWriteToFile());
  WriteAll(f.Open("wb"), "0123456789");
  EXPECT_EQ(f.GetFileDataSize(), 10);
  EXPECT_TRUE(f.CanWriteToFile());
  std::FILE* rw = f.Open("r+b");
  std::fseek(rw, 2, SEEK_SET);
  WriteAll(rw, "ab");
  EXPECT_EQ(ReadAll(f), "01ab456789");
  WriteAll(f.OpenDataFork(tarn::kReadWritePermission), "Z");  // no truncation
  EXPECT_EQ(ReadAll(f), "Z1ab456789");
  const File g(In(U("g.raw")));
  WriteAll(g.OpenDataFork(tarn::kWritePermission), "new");  // created when missing
  EXPECT_EQ(g.GetFileDataSize(), 3);
  ExpectSystemError([&] { (void)File(In(U("h.raw"))).OpenDataFork(tarn::kReadPermission); },
                    tarntest::NotFoundCode(), In(U("h.raw")).GetFullPath());
}

TEST_F(FileTest, NonASCIINamesRoundTrip) {
  const UString name = U(u8"Grüße_日本_\U0001F3B5.wav");
  const File f = File::CreateOnDisk(In(name), "WAVE", 0);
  WriteAll(f.Open("wb"), "RIFF");
  std::size_t seen = 0;
  for (const auto& entry : std::filesystem::directory_iterator(dir_)) {
    EXPECT_EQ(tarntest::ToU(entry.path().filename()), name);
    ++seen;
  }
  EXPECT_EQ(seen, 1u);
  EXPECT_TRUE(In(name).IsFile());
  EXPECT_EQ(ReadAll(File(In(name))), "RIFF");
  EXPECT_EQ(f.GetType(), tarn::FileTypeClass("WAVE"));
  FileSpecification taken = In(name);
  taken.MakeUnique();
  EXPECT_EQ(taken.GetName(), U(u8"Grüße_日本_\U0001F3B5 2.wav"));
  // A name read back from the system compares equal to the one created.
  const FileSpecification listed(tarntest::ToU(std::filesystem::directory_iterator(dir_)->path()));
  EXPECT_EQ(listed, In(name));
}

TEST_F(FileTest, ModificationDateRoundTrips) {
  const File f = File::CreateOnDisk(In(U("dated.wav")), "WAVE", 0);
  const FileDate dates[] = {FileDate(1'600'000'000, 123'456'700), FileDate(0, 0),
                            FileDate(4'102'444'800, 999'999'900)};  // 2100-01-01
  for (const FileDate& d : dates) {
    f.SetModificationDate(d);
    const FileDate back = f.GetModificationDate();
    EXPECT_EQ(back.GetSeconds(), d.GetSeconds());
    EXPECT_EQ(back.GetNanoseconds(), d.GetNanoseconds());
  }
  const FileDate before = FileDate::Now();
  WriteAll(f.Open("wb"), "x");
  EXPECT_GE(f.GetModificationDate().GetSeconds(), before.GetSeconds() - 2);
  ExpectSystemError([&] { (void)FileDate::Get(In(U("none"))); }, tarntest::NotFoundCode(),
                    In(U("none")).GetFullPath());
  ExpectSystemError([&] { FileDate::Set(In(U("none")), FileDate(1, 0)); }, tarntest::NotFoundCode(),
                    In(U("none")).GetFullPath());
}

TEST_F(FileTest, ResourceForkIsSeparateFromData) {
  File f = File::CreateResFileOnDisk(In(U("r.sd2")), "Sd2f", 0);
  EXPECT_EQ(f.GetFileResourceSize(), 0);
  WriteAll(f.Open("wb"), "DATA12");
  WriteAll(f.OpenResourceFork(tarn::kWritePermission), "RSRC");
  EXPECT_EQ(f.GetFileDataSize(), 6);
  EXPECT_EQ(f.GetFileResourceSize(), 4);
  EXPECT_EQ(f.GetFileTotalSize(), 10);
  EXPECT_EQ(File::ResourceForkPath(f.GetSpecification().GetFullPath()),
            f.GetSpecification().GetFullPath() + U(":AFP_Resource"));
  std::FILE* r = f.OpenResourceFork(tarn::kReadPermission);
  char buf[8] = {};
  EXPECT_EQ(std::fread(buf, 1, sizeof buf, r), 4u);
  File::CloseFork(r);
  EXPECT_EQ(std::string(buf), "RSRC");
  // The fork travels with the file and goes when it is deleted.
  f.Rename(U("renamed.sd2"));
  EXPECT_EQ(f.GetFileResourceSize(), 4);
  EXPECT_EQ(File(In(U("r.sd2"))).GetFileResourceSize(), 0);
  f.Delete();
  EXPECT_EQ(CountEntries(), 0u);
  const File plain = File::CreateOnDisk(In(U("plain.wav")), "WAVE", 0);
  EXPECT_EQ(plain.GetFileResourceSize(), 0);
}

TEST_F(FileTest, RenameMoveReplaceDelete) {
  File a = File::CreateOnDisk(In(U("a.wav")), "WAVE", 0);
  WriteAll(a.Open("wb"), "A");
  const File b = File::CreateOnDisk(In(U("b.wav")), "WAVE", 0);
  ExpectSystemError([&] { a.Rename(U("b.wav")); }, tarntest::RenameExistsCode(),
                    In(U("a.wav")).GetFullPath() + U("\n") + In(U("b.wav")).GetFullPath());
  EXPECT_EQ(a.GetSpecification().GetName(), U("a.wav"));
  a.Rename(U("c.wav"));
  EXPECT_EQ(a.GetSpecification(), In(U("c.wav")));
  EXPECT_FALSE(In(U("a.wav")).Exists());
  MakeFolder(U("sub"));
  a.MoveTo(In(U("sub")), U(u8"moved é.wav"));
  EXPECT_EQ(a.GetSpecification().GetParentFolder(), In(U("sub")));
  EXPECT_EQ(ReadAll(a), "A");
  File target(In(U("b.wav")));
  target.ReplaceContents(a);
  EXPECT_EQ(ReadAll(target), "A");
  EXPECT_FALSE(a.GetSpecification().Exists());
  target.Delete();
  EXPECT_FALSE(In(U("b.wav")).Exists());
  ExpectSystemError([&] { target.Delete(); }, tarntest::NotFoundCode(),
                    In(U("b.wav")).GetFullPath());
}

}  // namespace

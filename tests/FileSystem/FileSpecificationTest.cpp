#include "tarn/FileSystem/FileSpecification.h"

#include <gtest/gtest.h>

#include "FsTestSupport.h"
#include "tarn/Errors/Fail.h"
#include "tarn/FileSystem/File.h"

namespace {

using tarn::FileSpecification;
using tarn::UString;
using tarntest::U;

UString Repeat(char c, std::size_t n) { return U(std::string(n, c).c_str()); }

class FileSpecificationTest : public tarntest::TempFolderTest {};

TEST_F(FileSpecificationTest, NamesAndKinds) {
  MakeFile(U("a.wav"));
  MakeFolder(U("sub"));
  const FileSpecification file = In(U("a.wav"));
  EXPECT_EQ(file.GetName(), U("a.wav"));
  EXPECT_EQ(file.GetDisplayName(), U("a.wav"));
  EXPECT_EQ(file.GetParentFolder(), folder_);
  EXPECT_EQ(file.GetDisplayPath(), file.GetFullPath());
  EXPECT_TRUE(file.Exists());
  EXPECT_TRUE(file.IsFile());
  EXPECT_FALSE(file.IsFolder());
  EXPECT_TRUE(In(U("sub")).IsFolder());
  EXPECT_FALSE(In(U("sub")).IsFile());
  EXPECT_FALSE(In(U("none")).Exists());
  EXPECT_TRUE(folder_.IsFolder());
  FileSpecification copy = file;
  copy.SetName(U("b.wav"));
  EXPECT_EQ(copy, In(U("b.wav")));
  EXPECT_NE(copy, file);
  FileSpecification moved = std::move(copy);
  EXPECT_EQ(moved.GetName(), U("b.wav"));
}

TEST_F(FileSpecificationTest, MissingFileSpecFailsWithFileSystemError) {
  EXPECT_NO_THROW(FileSpecification(In(U("none")).GetFullPath(), tarn::kMissingFileSpecAllowed));
  try {
    FileSpecification s(In(U("none")).GetFullPath(), tarn::kMissingFileSpecFails);
    FAIL() << "no throw";
  } catch (const tarn::TarnError& e) {
    EXPECT_TRUE(tarn::IsFileSystemError(e));
    EXPECT_EQ(e.GetKind(), "OS");
    EXPECT_EQ(e.GetSystem(), "File I/O");
    EXPECT_EQ(e.GetIntErrorCode(), -43);
    ASSERT_TRUE(e.GetAttachment().has_value());
    EXPECT_EQ(*e.GetAttachment(), In(U("none")).GetDisplayPath());
  }
}

TEST_F(FileSpecificationTest, FailFSErrAttachesOneOrTwoDisplayPaths) {
  EXPECT_NO_THROW(tarn::FailFSErr(0, In(U("x"))));
  EXPECT_NO_THROW(tarn::FailFSErr(0, In(U("x")), In(U("y"))));
  try {
    tarn::FailFSErr(-48, In(U("x")), In(U("y")));
    FAIL() << "no throw";
  } catch (const tarn::TarnError& e) {
    EXPECT_EQ(e.GetIntErrorCode(), -48);
    EXPECT_EQ(e.GetSubsystem(), "");
    UString both = In(U("x")).GetDisplayPath();
    both += U("\n");
    both += In(U("y")).GetDisplayPath();
    EXPECT_EQ(*e.GetAttachment(), both);
  }
}

TEST_F(FileSpecificationTest, MakeUniqueSkipsTakenNumbers) {
  MakeFile(U("Take.wav"));
  MakeFile(U("Take 2.wav"));
  FileSpecification s = In(U("Take.wav"));
  s.MakeUnique();
  EXPECT_EQ(s.GetName(), U("Take 3.wav"));
  FileSpecification free = In(U("Fresh.wav"));
  free.MakeUnique();
  EXPECT_EQ(free.GetName(), U("Fresh.wav"));
  FileSpecification noDot = In(U("Take"));
  MakeFile(U("Take"));
  noDot.MakeUnique();
  EXPECT_EQ(noDot.GetName(), U("Take 2"));
  FileSpecification twoDots = In(U("a.b.wav"));
  MakeFile(U("a.b.wav"));
  twoDots.MakeUnique();
  EXPECT_EQ(twoDots.GetName(), U("a.b 2.wav"));
}

TEST_F(FileSpecificationTest, MakeUniqueAddingExtensionKeepsWholeName) {
  MakeFile(U("Mix.1.wav"));
  FileSpecification s = In(U("Mix.1"));
  s.MakeUniqueAddingExtension(U(".wav"));
  EXPECT_EQ(s.GetName(), U("Mix.1 2.wav"));
  FileSpecification t = In(U("Other"));
  t.MakeUniqueAddingExtension(U(".aif"));
  EXPECT_EQ(t.GetName(), U("Other.aif"));
}

TEST_F(FileSpecificationTest, MakeUniqueModesCountOnlyTheirKind) {
  MakeFolder(U("Take.wav"));
  MakeFile(U("Dir"));
  FileSpecification s = In(U("Take.wav"));
  s.MakeUnique(tarn::kMakeUniqueFile);  // a folder does not take a file's name
  EXPECT_EQ(s.GetName(), U("Take.wav"));
  s.MakeUnique(tarn::kMakeUniqueAnything);
  EXPECT_EQ(s.GetName(), U("Take 2.wav"));
  FileSpecification d = In(U("Dir"));
  d.MakeUnique(tarn::kMakeUniqueFolder);  // a file does not take a folder's name
  EXPECT_EQ(d.GetName(), U("Dir"));
  d.MakeUnique(tarn::kMakeUniqueFile);
  EXPECT_EQ(d.GetName(), U("Dir 2"));
  // In file mode a folder at a candidate counts as free.
  MakeFile(U("Song.wav"));
  MakeFolder(U("Song 2.wav"));
  FileSpecification f = In(U("Song.wav"));
  f.MakeUnique(tarn::kMakeUniqueFile);
  EXPECT_EQ(f.GetName(), U("Song 2.wav"));
  f = In(U("Song.wav"));
  f.MakeUnique(tarn::kMakeUniqueAnything);
  EXPECT_EQ(f.GetName(), U("Song 3.wav"));
}

TEST(MakeUniqueCandidate, CutsBaseToKeepWithin255Units) {
  const UString base = Repeat('a', 252);
  UString c = FileSpecification::MakeUniqueCandidate(base, U(".wav"), 2);
  EXPECT_EQ(c.length(), 255u);
  UString expected = Repeat('a', 249);
  expected += U(" 2.wav");
  EXPECT_EQ(c, expected);
  c = FileSpecification::MakeUniqueCandidate(base, U(".wav"), 10);
  EXPECT_EQ(c.length(), 255u);
  EXPECT_EQ(c.substr(248), U(" 10.wav"));
  EXPECT_EQ(FileSpecification::MakeUniqueCandidate(U("Take"), U(".wav"), 3), U("Take 3.wav"));
  EXPECT_EQ(FileSpecification::MakeUniqueCandidate(U(""), U(""), 7), U(" 7"));
  for (unsigned n : {2u, 9u, 10u, 99u, 100u, 123456u}) {
    for (std::size_t extLen : {0u, 4u, 250u, 252u, 253u, 254u, 300u}) {
      const UString ext = Repeat('e', extLen);
      const UString name = FileSpecification::MakeUniqueCandidate(base, ext, n);
      EXPECT_LE(name.length(), 255u) << n << " " << extLen;
      EXPECT_NE(name.find(U(std::to_string(n).c_str())), UString::npos);
    }
  }
}

TEST(MakeUniqueCandidate, NeverSplitsASurrogatePair) {
  // 248 'a' + U+1F3B5 (two units) = 250 units; room for 249 would split it.
  UString base = Repeat('a', 248);
  base += 0x1F3B5u;
  const UString c = FileSpecification::MakeUniqueCandidate(base, U(".wav"), 2);
  EXPECT_EQ(c.length(), 254u);
  EXPECT_EQ(c.substr(0, 249), Repeat('a', 248) + U(" "));
}

TEST_F(FileSpecificationTest, LongNamesOnDiskBecomeUniqueWithin255) {
  UString longName = Repeat('b', 250);
  longName += U(".wav");  // 254 units
  MakeFile(longName);
  FileSpecification s = In(longName);
  s.MakeUnique();
  UString expected = Repeat('b', 249);
  expected += U(" 2.wav");
  EXPECT_EQ(s.GetName(), expected);
  EXPECT_NO_THROW(tarn::File::CreateOnDisk(s, "WAVE", 0));

  // The extension leaves no room for a base: the name is still made valid.
  UString dotName = U(".");
  dotName += Repeat('e', 253);  // 254 units, all "extension"
  MakeFile(dotName);
  FileSpecification d = In(dotName);
  d.MakeUnique();
  EXPECT_LE(d.GetName().length(), 255u);
  EXPECT_NE(d.GetName(), dotName);
  const tarn::File created = tarn::File::CreateOnDisk(In(dotName), "TEXT", 0, tarn::kAdjustName);
  EXPECT_EQ(created.GetSpecification(), d);
  EXPECT_TRUE(d.IsFile());
}

}  // namespace

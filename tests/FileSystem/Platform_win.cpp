#include "FsTestSupport.h"

namespace tarntest {
const char* SystemKind() { return "Windows"; }
int ExistsCode() { return 80; }         // ERROR_FILE_EXISTS
int NotFoundCode() { return 2; }        // ERROR_FILE_NOT_FOUND
int RenameExistsCode() { return 183; }  // ERROR_ALREADY_EXISTS
}  // namespace tarntest

namespace {

using tarn::FileSpecification;
using tarntest::U;

TEST(PathSyntaxWin, NamesParentsAndRoots) {
  FileSpecification spec(U("C:\\a/b\\c.wav"));
  EXPECT_EQ(spec.GetFullPath(), U("C:\\a\\b\\c.wav"));
  EXPECT_EQ(spec.GetParentFolder().GetParentFolder().GetParentFolder().GetFullPath(), U("C:\\"));
  EXPECT_TRUE(FileSpecification(U("C:\\")).IsVolume());
  EXPECT_EQ(FileSpecification(U("C:\\a\\")).GetFullPath(), U("C:\\a"));
  EXPECT_EQ(FileSpecification(U("\\\\server\\share\\x")).GetParentFolder().GetFullPath(),
            U("\\\\server\\share\\"));
  EXPECT_FALSE(FileSpecification(U("rel\\x")).IsValid());
  EXPECT_EQ(FileSpecification(U("C:\\a b\\x.wav")).GetFileURL(), U("file:///C:/a%20b/x.wav"));
}

}  // namespace

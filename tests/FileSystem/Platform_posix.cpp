#include <cerrno>

#include "FsTestSupport.h"

namespace tarntest {
const char* SystemKind() { return "POSIX"; }
int ExistsCode() { return EEXIST; }
int NotFoundCode() { return ENOENT; }
int RenameExistsCode() { return EEXIST; }
}  // namespace tarntest

namespace {

using tarn::FileSpecification;
using tarntest::U;

TEST(PathSyntaxPosix, NamesParentsRootsAndURLs) {
  FileSpecification spec(U("/a/b/c.wav"));
  EXPECT_EQ(spec.GetParentFolder().GetParentFolder().GetParentFolder().GetFullPath(), U("/"));
  EXPECT_EQ(FileSpecification(U("/")).GetParentFolder().GetFullPath(), U("/"));
  EXPECT_TRUE(FileSpecification(U("/")).IsVolume());
  EXPECT_EQ(FileSpecification(U("/a/b//")), FileSpecification(U("/a/b")));
  EXPECT_FALSE(FileSpecification(U("rel/x")).IsValid() || FileSpecification().IsValid());
  spec.SetName(U("d.aif"));
  EXPECT_EQ(spec.GetFullPath(), U("/a/b/d.aif"));
  EXPECT_EQ(FileSpecification(FileSpecification(U("/")), U("x")).GetFullPath(), U("/x"));
  EXPECT_EQ(FileSpecification(U(u8"/tmp/a b/Grüße.wav")).GetFileURL(),
            U("file:///tmp/a%20b/Gr%C3%BC%C3%9Fe.wav"));
}

}  // namespace

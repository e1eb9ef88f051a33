// The identity of a file, folder or volume by its full path.
//
// A `FileSpecification` names an object whether or not it exists yet; only the
// queries (`Exists`, `IsFile`, ...) and `MakeUnique...` look at the disk. It is
// a handle class: it owns one private implementation object that holds the
// full path as a `UString` (UTF-16; on POSIX the path's bytes are its UTF-8
// form). Copying copies the path; `operator==` compares the paths exactly.
// A moved-from FileSpecification has no implementation: using it is an assertion
// failure ("px != 0"), as with any handle class of the library.
//
// Separators: "/" on POSIX; "\" (and "/", accepted on input) on Windows. A
// trailing separator is dropped on construction (except from a root), so
// "/a/b/" and "/a/b" name the same folder.
//
// Thread safety: a FileSpecification is a value; distinct objects may be used on
// distinct threads freely. Queries do file-system I/O and block accordingly.
#pragma once

#include <cstdint>
#include <memory>

#include "tarn/String/UString.h"

namespace tarn {

// What a constructor does when nothing exists at the path.
enum MissingFileSpec : int {
  kMissingFileSpecAllowed = 0,  // keep the path (the usual case: a file to create)
  kMissingFileSpecFails = 1,    // throw FailFSErr(-43, spec) (file not found)
};

// Which kind of existing object makes a name taken, for MakeUnique.
enum MakeUniqueMode : int {
  kMakeUniqueFile = 0,      // only a file takes the name
  kMakeUniqueFolder = 1,    // only a folder takes the name
  kMakeUniqueAnything = 2,  // any object takes the name
};

class FileSpecification {
 public:
  // The longest name (last path component), in UTF-16 units, MakeUnique makes.
  static constexpr std::size_t kMaxNameLength = 255;

  FileSpecification();  // empty path; IsValid() is false
  explicit FileSpecification(const UString& fullPath);
  FileSpecification(const UString& fullPath, MissingFileSpec missing);
  // `name` inside the folder `folder`.
  FileSpecification(const FileSpecification& folder, const UString& name);
  FileSpecification(const FileSpecification& other);
  FileSpecification(FileSpecification&& other) noexcept;
  FileSpecification& operator=(const FileSpecification& other);
  FileSpecification& operator=(FileSpecification&& other) noexcept;
  ~FileSpecification();

  [[nodiscard]] bool operator==(const FileSpecification& other) const;
  [[nodiscard]] bool operator!=(const FileSpecification& other) const { return !(*this == other); }

  // Path and names.
  [[nodiscard]] UString GetFullPath() const;
  void GetFullPath(UString& path) const;
  [[nodiscard]] UString GetName() const;         // last component; for a root, the root itself
  void SetName(const UString& name);             // replaces the last component
  [[nodiscard]] UString GetDisplayName() const;  // the name as shown to users
  [[nodiscard]] UString GetDisplayPath() const;  // the full path as shown to users
  [[nodiscard]] UString GetFileURL() const;      // "file://" URL, UTF-8 percent-encoded

  // Navigation (no disk access).
  [[nodiscard]] FileSpecification GetParentFolder() const;  // a root is its own parent
  [[nodiscard]] FileSpecification GetVolume() const;        // the root of the path
  [[nodiscard]] bool OnSameVolume(const FileSpecification& other) const;

  // Queries (disk access; never throw).
  [[nodiscard]] bool IsValid() const;  // the path is non-empty and absolute
  [[nodiscard]] bool Exists() const;
  [[nodiscard]] bool IsFile() const;
  [[nodiscard]] bool IsFolder() const;
  [[nodiscard]] bool IsVolume() const;       // the path is a root
  [[nodiscard]] bool IsApplication() const;  // an existing file named *.exe

  // Gives the file a name at which no object of the mode's kind
  // exists: "Take.wav" becomes "Take 2.wav", "Take 3.wav", ... Names made
  // here never exceed kMaxNameLength units; the base is cut to make room.
  // MakeUnique splits the current name at its last "." to keep the
  // extension; MakeUniqueAddingExtension appends `extension` (with its dot,
  // e.g. ".wav") to the whole current name.
  void MakeUnique(MakeUniqueMode mode = kMakeUniqueAnything);
  void MakeUniqueAddingExtension(const UString& extension,
                                 MakeUniqueMode mode = kMakeUniqueAnything);
  // The n-th name MakeUnique tries: base, a space, n, extension, with the
  // base cut (never inside a surrogate pair) so that the result has at most
  // kMaxNameLength units. An extension too long to leave room is cut as
  // part of the base instead.
  [[nodiscard]] static UString MakeUniqueCandidate(const UString& base, const UString& extension,
                                                   unsigned n);

  class Impl;

 private:
  [[nodiscard]] Impl& Get() const;
  std::unique_ptr<Impl> fImpl;
};

}  // namespace tarn

#pragma once

#include <cstddef>
#include <cstdint>
#include <span>
#include <string>
#include <string_view>
#include <vector>

// Which file has which label, without a look at the files: what a plan of a domain is made from.
namespace Enforce {

// Labels of places that have none: kNotIndexed where the index cannot tell, since another mount
// begins there, or it could not be looked at; kUnlabelled where there surely is none.
inline constexpr std::uint32_t kNotIndexed = 0;
inline constexpr std::uint32_t kUnlabelled = 1;

// A file or directory whose label is another one than that of the directory above it.
struct LabelledPlace {
  std::string path;  // absolute within the root, without "." and "..", and no slash at its end
  std::uint32_t label = kNotIndexed;
  bool isDirectory = false;

  bool operator==(const LabelledPlace&) const = default;
};

// The order of places: a directory, then all that is below it, then what comes after it by name.
bool ComesBefore(std::string_view path, std::string_view other);

// What an index is of.
struct IndexedRoot {
  std::uint64_t device = 0;  // of the root directory, as stat(2) tells it
  std::uint64_t serial = 0;  // of the index; no two have the same

  bool operator==(const IndexedRoot&) const = default;
};

// The labels of all files of a root at one moment. A file that is not named has the label of the
// nearest place above it.
class LabelIndex {
 public:
  // Of `labelledPlaces`, in ascending order. Throws Braxo::Lib::BraxoException when they are not,
  // and for a path that is not absolute.
  LabelIndex(const IndexedRoot& indexedRoot, std::vector<LabelledPlace> labelledPlaces);

  const IndexedRoot& Root() const { return root; }

  // The label of the file at `path`, which is absolute and without links; kNotIndexed also where no
  // place is above it.
  std::uint32_t LabelOf(std::string_view path) const;

  // The places below the directory at `directory`, itself not among them, in ascending order. They
  // belong to the index.
  std::span<const LabelledPlace> PlacesBelow(std::string_view directory) const;

  // All places, in ascending order.
  std::vector<LabelledPlace>::const_iterator begin() const { return places.begin(); }
  std::vector<LabelledPlace>::const_iterator end() const { return places.end(); }
  std::size_t Size() const { return places.size(); }

  // Writes the index to the absolute path `file` (mode 0600), which has the old content until it
  // has the whole new one. Throws Braxo::Lib::BraxoException when it cannot be written.
  void Write(const std::string& file) const;

  // Reads what Write() has written. Whether the file is to be trusted is for the caller to say.
  // Throws Braxo::Lib::BraxoException for a file that cannot be read, is damaged, or is of another
  // version.
  static LabelIndex Read(const std::string& file);

 private:
  IndexedRoot root;
  std::vector<LabelledPlace> places;
};

}  // namespace Enforce

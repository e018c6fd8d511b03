#pragma once

#include <string>

namespace SecPolicyCli {

// A directory that only this user may use; removed, with all that is in it, with this object.
class ScratchDirectory {
 public:
  // Throws Braxo::Lib::BraxoException when there is no place for it.
  ScratchDirectory();
  ScratchDirectory(const ScratchDirectory&) = delete;
  ScratchDirectory& operator=(const ScratchDirectory&) = delete;
  ~ScratchDirectory();

  const std::string& Path() const { return path; }

  // The path of the file `name` in it.
  std::string File(const std::string& name) const { return path + "/" + name; }

 private:
  std::string path;
};

}  // namespace SecPolicyCli

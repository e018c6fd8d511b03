#include "secpolicy/parse/directory.h"
#include "secpolicy/report.h"
#include "secpolicy/secpolicy.h"

namespace SecPolicy {

void GetFileList(const std::string& dir, std::map<std::string, std::string>& files) {
  Directory directory(dir);
  if (!directory.IsOpen()) RaiseError("Unable to open policy directory " + dir);

  while (const dirent* entry = directory.Next()) {
    if (entry->d_type == DT_REG) files[dir + "/" + entry->d_name] = entry->d_name;
  }
}

}  // namespace SecPolicy

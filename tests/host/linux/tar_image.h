#pragma once

#include <filesystem>
#include <string>

namespace LinuxHostTest {

// A tar archive put together header by header, so that it can say what no archiver would write.
class TarImage {
 public:
  TarImage& File(const std::string& name, const std::string& content, unsigned int mode = 0644);
  TarImage& Directory(const std::string& name, unsigned int mode = 0755);
  TarImage& SymbolicLink(const std::string& name, const std::string& target);
  TarImage& HardLink(const std::string& name, const std::string& target,
                     const std::string& content = "");
  TarImage& Fifo(const std::string& name);
  TarImage& CharacterDevice(const std::string& name);
  TarImage& BlockDevice(const std::string& name);

  // Puts `key` with `value` into the extended header of the next entry.
  TarImage& Extended(const std::string& key, const std::string& value);

  // The archive as it stands, with its end.
  std::string Bytes() const;

  // Writes it to the file `path`.
  void Save(const std::filesystem::path& path) const;

 private:
  TarImage& Entry(char type, const std::string& name, const std::string& target, unsigned int mode,
                  const std::string& content);
  void Append(char type, const std::string& name, const std::string& target, unsigned int mode,
              const std::string& content);

  std::string bytes;
  std::string extended;
};

}  // namespace LinuxHostTest

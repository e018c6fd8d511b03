#include "host_root.h"

#include <fstream>
#include <iterator>
#include <sstream>
#include <stdexcept>

namespace CrashTest {
namespace {

constexpr int kLabels = 12;

std::string Numbered(const std::string& name, int number) { return name + std::to_string(number); }

std::string Objects() {
  std::string lines;
  for (int label = 0; label < kLabels; ++label) lines += Numbered("data", label) + "\n";
  return lines;
}

// Written in the order in which the kinds are installed.
std::string Rules(int domain) {
  std::ostringstream lines;
  for (int label = 0; label < kLabels; ++label) lines << "-a data" << label << " read grant\n";
  for (const char* word : {"cap_chown", "cap_kill", "cap_setuid"}) {
    lines << "-c " << word << " grant\n";
  }
  lines << "-d data0 service" << domain << " exec grant\n";
  lines << "-f data1 data2 regular grant\n";
  for (int port = 0; port < 5; ++port) lines << "-p bind_port " << 1000 + port << " grant\n";
  for (int link = 0; link < kLinks; ++link) lines << "-r /data/link" << link << " rw\n";
  for (const char* word : {"accept4", "bind", "listen", "socket"}) {
    lines << "-s " << word << " grant\n";
  }
  lines << "-u data3 stream grant\n";
  return lines.str();
}

void WritePolicy(const std::filesystem::path& policy) {
  for (const char* directory : {"objects", "domains", "fileLabels", "tardisks", "early/domains"}) {
    std::filesystem::create_directories(policy / directory);
  }
  WriteFile(policy / "objects/base", Objects());
  for (const char* name : {"appDom", "daemonFrameworkDom", "globalVMDom", "ioFilterDom"}) {
    WriteFile(policy / "domains" / name, "-c cap_chown grant\n");
  }
  for (int domain = 0; domain < kServices; ++domain) {
    WriteFile(policy / "domains" / Numbered("service", domain), Rules(domain));
  }
}

}  // namespace

HostRoot::HostRoot() {
  for (const char* directory : {"data", "run", "tardisks"}) {
    std::filesystem::create_directory(root / directory);
  }
  for (int link = 0; link < kLinks; ++link) {
    WriteFile(Path() / "data" / Numbered("file", link), "");
    std::filesystem::create_symlink(Numbered("file", link),
                                    Path() / "data" / Numbered("link", link));
  }
  WritePolicy(root / "etc/zorvan/secpolicy");
}

void HostRoot::Forget() const { std::filesystem::remove_all(State().parent_path()); }

std::string ReadFile(const std::filesystem::path& path) {
  std::ifstream file(path, std::ios::binary);
  return {std::istreambuf_iterator<char>(file), std::istreambuf_iterator<char>()};
}

void WriteFile(const std::filesystem::path& path, const std::string& content) {
  std::ofstream file(path, std::ios::binary | std::ios::trunc);
  file << content << std::flush;
  if (!file) throw std::runtime_error("unable to write " + path.string());
}

}  // namespace CrashTest

#include "support/scripted_host.h"

#include <cxxabi.h>
#include <gtest/gtest.h>
#include <sys/stat.h>

#include <algorithm>
#include <cerrno>
#include <cstdlib>
#include <iostream>

namespace SecPolicyTest {
namespace {

constexpr std::size_t kInodeRecordSize = 548;
constexpr std::size_t kTardiskNameOffset = 36;

ScriptedHost* currentHost = nullptr;

unsigned long InodeOf(const std::string& path) {
  struct stat attributes = {};
  if (stat(path.c_str(), &attributes) != 0) {
    ADD_FAILURE() << "no such file to script a tardisk for: " << path;
  }
  return attributes.st_ino;
}

// Statistics that are no text, the name, and rubbish behind its NUL.
std::string RecordOf(const std::string& tardisk) {
  std::string record(kTardiskNameOffset, '\x7f');
  record += tardisk;
  record += '\0';
  record.resize(kInodeRecordSize, 'Z');
  return record;
}

std::string CurrentExceptionType() {
  const std::type_info* type = abi::__cxa_current_exception_type();
  int status = 0;
  const std::unique_ptr<char, decltype(&std::free)> name(
      abi::__cxa_demangle(type->name(), nullptr, nullptr, &status), &std::free);
  return status == 0 ? name.get() : type->name();
}

}  // namespace

// Set from here, read by the allocation functions.
bool overwriteErrno = false;

ScriptedHost::ScriptedHost()
    : standardOutput(trace, std::cout, "stdout"), standardError(trace, std::cerr, "stderr") {
  if (currentHost != nullptr) std::abort();
  currentHost = this;
  domains[0].name = "hostDom";
  DeclareLabel("unlabeled", 2);
  DeclareLabel("tardiskDefault", 3);
  overwriteErrno = true;
}

ScriptedHost::~ScriptedHost() {
  overwriteErrno = false;
  EXPECT_EQ(aliveInterfaces, 0) << "interface objects left";
  EXPECT_EQ(aliveReaders, 0) << "sysinfo readers left";
  EXPECT_EQ(aliveOptions, 0) << "option objects left";
  currentHost = nullptr;
}

ScriptedHost& ScriptedHost::Current() {
  if (currentHost == nullptr) std::abort();
  return *currentHost;
}

unsigned int ScriptedHost::DeclareDomain(const std::string& name) {
  unsigned int slot = 1;
  while (domains.contains(slot)) ++slot;
  domains[slot].name = name;
  return slot;
}

void ScriptedHost::DeclareWellKnownDomains() {
  for (const char* name : {"globalVMDom", "ioFilterDom", "appDom", "daemonFrameworkDom"}) {
    DeclareDomain(name);
  }
}

void ScriptedHost::SetAttribute(const std::string& path, std::uint32_t id) {
  attributes[path].assign(reinterpret_cast<const char*>(&id), sizeof id);
}

void ScriptedHost::SetTardisk(const std::string& path, const std::string& name) {
  SetInodeRecord(path, RecordOf(name));
}

void ScriptedHost::SetInodeRecord(const std::string& path, const std::string& record) {
  inodes[InodeOf(path)] = {path, record};
}

void ScriptedHost::Note(const std::string& call, const std::string& arguments) {
  trace.Add(call + "(" + arguments + ")");
}

void ScriptedHost::Enter(const std::string& call, const std::string& arguments) {
  Note(call, arguments);
  const unsigned int number = ++callCounts[call];
  fallibleCalls.push_back(trace.Size() - 1);
  if (fallibleCalls.size() == sweepCall) std::rethrow_exception(sweepException);

  const auto fits = [&](const Fault& fault) {
    return fault.call == call && (fault.which.nth == 0 || fault.which.nth == number) &&
           fault.which.arguments.value_or(arguments) == arguments;
  };
  const auto fault = std::find_if(faults.rbegin(), faults.rend(), fits);
  if (fault != faults.rend()) std::rethrow_exception(fault->exception);
}

std::optional<int> ScriptedHost::ErrnoFault(const std::string& call,
                                            const std::string& path) const {
  const auto fault = errnoFaults.find({call, path});
  if (fault == errnoFaults.end()) return std::nullopt;
  return fault->second;
}

Zorvan::Kernel::CallResult ScriptedHost::AnswerKernelCall(std::uint32_t number,
                                                          std::span<const std::uint64_t> args) {
  const auto answer = kernelCalls.find(number);
  if (answer == kernelCalls.end()) return {0, 0};
  return answer->second(args);
}

unsigned int ScriptedHost::LabelId(const std::string& name, TeskAccessLabelType type) {
  auto& known = labels[type];
  const auto label = known.find(name);
  if (label != known.end()) return label->second;
  if (strict) return 1;

  unsigned int next = 2;
  for (const auto& [other, id] : known) next = std::max(next, id + 1);
  return known[name] = next;
}

std::string ScriptedHost::InodeName(unsigned long inode) const {
  const auto known = inodes.find(inode);
  return known == inodes.end() ? "inode" : Quoted(known->second.path);
}

std::string ScriptedHost::InodeRecord(unsigned long inode) const {
  const auto known = inodes.find(inode);
  return known == inodes.end() ? RecordOf(defaultTardiskName) : known->second.record;
}

std::string Transcript::Text() const {
  std::string text;
  for (const std::string& line : trace) text += line + "\n";
  if (exceptionType.empty()) return text + "returns\n";
  if (exceptionText.empty()) return text + "throws " + exceptionType + "\n";
  return text + "throws " + exceptionType + ": " + exceptionText + "\n";
}

std::string Transcript::Reports() const {
  Transcript reports = *this;
  std::erase_if(reports.trace, [](const std::string& line) {
    return !line.starts_with("syslog(") && !line.starts_with("WriteToKlog(") &&
           !line.starts_with("stderr ") && !line.starts_with("stdout ");
  });
  return reports.Text();
}

Transcript Record(const std::function<void()>& function) {
  ScriptedHost& host = ScriptedHost::Current();
  const auto start = static_cast<std::ptrdiff_t>(host.trace.Lines().size());
  Transcript transcript;
  try {
    function();
  } catch (const std::exception& exception) {
    transcript.exceptionType = CurrentExceptionType();
    transcript.exceptionText = exception.what();
  } catch (...) {
    transcript.exceptionType = CurrentExceptionType();
  }
  const auto& lines = host.trace.Lines();
  transcript.trace.assign(lines.begin() + start, lines.end());
  return transcript;
}

std::string Lines(std::initializer_list<std::string> lines) {
  std::string text;
  for (const std::string& line : lines) text += line + "\n";
  return text;
}

}  // namespace SecPolicyTest

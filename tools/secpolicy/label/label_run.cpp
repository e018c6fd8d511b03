#include "label_run.h"

#include <cerrno>
#include <cstring>
#include <iostream>
#include <utility>

#include "braxo/misc/strcat.h"
#include "root.h"
#include "text/visible.h"

namespace SecPolicyCli {

using TeskCtl::Security::TESKACCESS_LABEL_OBJECT;

void LabelRun::Print(const std::string& line) {
  progress.Clear();
  std::cout << Visible(line) << '\n';
}

void LabelRun::PrintDocument(Json document, const char* list) {
  if (!isJson) return;
  document[list] = std::move(findings);
  progress.Clear();
  std::cout << document.Text();
}

void LabelRun::Error(const std::string& message) {
  errors.OnError(message);
  progress.Clear();
  // What was printed before it stands before it.
  std::cout.flush();
  std::cerr << "Error: " + Visible(message) + "\n" << std::flush;
}

std::uint32_t LabelRun::FindLabel(const std::string& name) {
  return access.LookupLabel(name, TESKACCESS_LABEL_OBJECT);
}

std::string LabelRun::NameOf(std::uint32_t id) {
  try {
    return access.GetLabel(id, TESKACCESS_LABEL_OBJECT);
  } catch (const Braxo::Lib::BraxoException&) {
    return Braxo::Misc::StrCat("a label that is gone (", id, ")");
  }
}

std::string WhyNoLabel(int error) {
  if (error != ENODATA) return std::strerror(error);
  return "has no label; " + Call("boot") +
         " gives every file of the root's file system its first one";
}

}  // namespace SecPolicyCli

#include "secpolicy/report.h"

#include <syslog.h>

#include <algorithm>
#include <iostream>

#include "braxo/misc/strcat.h"
#include "secpolicy/observed/policy_observer.h"
#include "secpolicy/secpolicy.h"
#include "teskctl/system.h"

namespace SecPolicy {

using Braxo::Lib::BraxoException;
using Braxo::Misc::StrCat;

SecPolicyRetryException::SecPolicyRetryException(const std::string& text) : BraxoException(text) {}

SecPolicyRetryException::SecPolicyRetryException(const std::string& text,
                                                 const Braxo::Lib::KweMessage& handle)
    : BraxoException(text, handle) {}

SecPolicyRetryException::SecPolicyRetryException(const SecPolicyRetryException&) = default;

SecPolicyRetryException::~SecPolicyRetryException() = default;

void SecpolicyInfo(const std::string& message) {
  if (TeskCtl::System::SyslogIsRunning()) {
    syslog(LOG_INFO, "%s", message.c_str());
    return;
  }
  TeskCtl::System::WriteToKlog(message, "[INFO]");
}

void SecpolicyError(const std::string& message) {
  std::cerr << StrCat("Error: ", message, "\n") << std::flush;
  if (TeskCtl::System::SyslogIsRunning()) {
    syslog(LOG_ERR, "Error: %s", message.c_str());
    return;
  }
  TeskCtl::System::WriteToKlog(message, "[ERR]");
}

PolicyObserver& Nobody() {
  static PolicyObserver nobody;
  return nobody;
}

void ReportError(const std::string& message, PolicyObserver& observer) {
  observer.OnError(message);
  SecpolicyError(message);
}

void PrintLine(std::string text) {
  text += '\n';
  std::cout << text << std::flush;
}

void DisplayHeader(const std::string& title, const std::string& subtitle) {
  const auto width = static_cast<unsigned int>(std::max(title.size(), subtitle.size()));
  const std::string rule(width, '-');

  PrintLine();
  PrintLine();
  PrintLine(rule);
  PrintLine(title);
  if (!subtitle.empty()) PrintLine(subtitle);
  PrintLine(rule);
}

void RaiseError(const std::string& message) { throw BraxoException(message); }

void RuleSizeError() { RaiseError("incorrect number of arguments for this rule type"); }

}  // namespace SecPolicy

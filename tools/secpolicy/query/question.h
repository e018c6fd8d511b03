#pragma once

#include <optional>
#include <span>
#include <stdexcept>
#include <string>
#include <vector>

#include "host/linux/operation/rule_origins.h"
#include "installed/installed_policy.h"

namespace SecPolicyCli {

// The words of a question cannot be understood; the message says what would be.
class QuestionError : public std::runtime_error {
 public:
  using std::runtime_error::runtime_error;
};

// What a word of a question stands for.
enum class QuestionWord {
  kPath,
  kSyscall,
  kCapability,
  kObject,
  kObjectAccess,
  kDomain,
  kFileKind,
  kSocketKind,
  kParameterCheck,
  kNumber,
};

// A kind of question. The words are those of the rule that answers it, in the same order.
struct QuestionForm {
  const char* action;
  const char* usage;
  std::vector<QuestionWord> words;
  const char* keyword;      // of the rules that answer it
  char letter = '\0';       // for a path: the permission of a -r rule
  const char* access = "";  // for a path: the access of an -a rule
};

std::span<const QuestionForm> QuestionForms();

// What is known of the file that a question is about.
struct AskedFile {
  std::vector<std::string> paths;  // as asked and, where that is another path, as it resolves
  bool exists = false;
  std::string label;  // empty when it has none
  bool labelIsInherited = false;
  bool labelIsBuiltIn = false;
  std::optional<LinuxHost::LabelOrigin> labelOrigin;  // empty when no policy file gave it
};

struct Question {
  const QuestionForm* form = nullptr;
  std::vector<std::string> words;
  std::optional<AskedFile> file;

  // "read /etc/ssh"
  std::string Text() const;
};

// Reads a question: the action and its words. Throws QuestionError for a word that the host or
// `policy` does not know.
Question ReadQuestion(const std::vector<std::string>& words, const InstalledPolicy& policy,
                      SecPolicy::TeskAccessInterfaceImpl& access);

// The domain `name`. Throws QuestionError when there is none.
const InstalledDomain& FindAskedDomain(const std::string& name, const InstalledPolicy& policy);

}  // namespace SecPolicyCli

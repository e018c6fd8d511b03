#include "host/linux/operation/host_words.h"

#include "host/linux/state/keyword_tables.h"

namespace LinuxHost {

std::map<std::string, long> HostWords(TeskCtl::Security::TeskAccess_KeywordType type) {
  if (type == TeskCtl::Security::TESKACCESS_KEYWORD_LABEL) return {};
  return FixedWords(type);
}

}  // namespace LinuxHost

#include "load_record.h"

#include <ctime>
#include <iostream>

#include "braxo/lib/exception.h"
#include "host/linux/load_record.h"

namespace SecPolicyCli {

void RecordLoad(const std::string& verb, const std::string& policyDir, const std::string& ending,
                const std::vector<std::string>& errors) {
  try {
    LinuxHost::RecordLoad({.verb = verb,
                           .directory = policyDir,
                           .time = std::time(nullptr),
                           .ending = ending,
                           .errorCount = errors.size(),
                           .errors = errors});
  } catch (const Braxo::Lib::BraxoException& failure) {
    if (ending != "done") return;
    std::cerr << "secpolicy: " << verb
              << ": 'secpolicy status' will not know of this load: " << failure.what() << std::endl;
  }
}

}  // namespace SecPolicyCli

#include "summary.h"

#include <iostream>

namespace SecPolicyCli {

void Summarize(const std::string& verb, const std::string& text) {
  std::cout.flush();
  std::cerr << "secpolicy: " << verb << ": " << text << std::endl;
}

}  // namespace SecPolicyCli

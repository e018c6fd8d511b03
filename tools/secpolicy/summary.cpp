#include "summary.h"

#include <iostream>

#include "text/visible.h"

namespace SecPolicyCli {

void Summarize(const std::string& verb, const std::string& text) {
  std::cout.flush();
  std::cerr << "secpolicy: " << verb << ": " << Visible(text) << std::endl;
}

}  // namespace SecPolicyCli

#include "policy/permissions.h"

#include <array>

#include "braxo/lib/exception.h"
#include "braxo/misc/strcat.h"

namespace Policy {
namespace {

struct Letter {
  char letter;
  Permission permission;
};

constexpr std::array kLetters = {Letter{'r', Permission::kRead}, Letter{'w', Permission::kWrite},
                                 Letter{'x', Permission::kExecute}};

const Letter* FindLetter(char letter) {
  for (const Letter& row : kLetters) {
    if (row.letter == letter) return &row;
  }
  return nullptr;
}

}  // namespace

Permissions Permissions::Parse(std::string_view letters) {
  Permissions permissions;
  for (const char letter : letters) {
    const Letter* const known = FindLetter(letter);
    if (known == nullptr || permissions.Has(known->permission)) {
      throw Braxo::Lib::BraxoException(Braxo::Misc::StrCat(
          "permissions '", letters, "' must be letters of \"rwx\", each at most once"));
    }
    permissions = permissions.With(known->permission);
  }
  return permissions;
}

std::string Permissions::Text() const {
  std::string letters;
  for (const Letter& row : kLetters) {
    if (Has(row.permission)) letters += row.letter;
  }
  return letters;
}

}  // namespace Policy

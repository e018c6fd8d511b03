#pragma once

#include <string>
#include <string_view>

// What comes from files may hold anything: control characters are shown as ^I and the like, so that
// none reaches the terminal.
namespace SecPolicyCli {

// True for the characters that are shown in two columns.
bool IsControl(char byte);

// Appends `character`, which TakeCharacter took, as it can be shown.
void AppendVisible(std::string& text, std::string_view character);

// Takes the first character off `text`, which is UTF-8 and not empty.
std::string_view TakeCharacter(std::string_view& text);

// The whole text as it can be shown.
std::string Visible(std::string_view text);

}  // namespace SecPolicyCli

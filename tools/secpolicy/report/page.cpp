#include "page.h"

#include <cstddef>
#include <string_view>

#include "host/linux/operation/text_digest.h"
#include "page_parts.h"

namespace SecPolicyCli {
namespace {

constexpr std::string_view kHexDigits = "0123456789abcdef";

// The bytes that the hexadecimal digits stand for, in base 64.
std::string Base64OfHex(std::string_view hex) {
  constexpr std::string_view kDigits =
      "ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz0123456789+/";
  constexpr std::size_t kHexOfGroup = 6;  // three bytes, which are four digits
  std::string text;
  for (std::size_t begin = 0; begin < hex.size(); begin += kHexOfGroup) {
    const std::string_view group = hex.substr(begin, kHexOfGroup);
    std::size_t bits = 0;
    for (const char digit : group) bits = bits << 4U | kHexDigits.find(digit);
    bits <<= 4U * (kHexOfGroup - group.size());
    const std::size_t digits = group.size() * 4 / 6 + 1;
    for (std::size_t digit = 0; digit < 4; ++digit) {
      text += digit < digits ? kDigits[bits >> (18U - 6U * digit) & 0x3fU] : '=';
    }
  }
  return text;
}

std::string Join(PageFiles files) {
  std::string text;
  for (const std::string_view file : files) text += file;
  return text;
}

// What a policy for the content of pages calls this text.
std::string SourceOf(std::string_view text) {
  return "'sha256-" + Base64OfHex(LinuxHost::DigestOf(text)) + "'";
}

std::string EscapeHtml(std::string_view text) {
  std::string escaped;
  for (const char letter : text) {
    switch (letter) {
      case '&':
        escaped += "&amp;";
        break;
      case '<':
        escaped += "&lt;";
        break;
      case '>':
        escaped += "&gt;";
        break;
      case '"':
        escaped += "&quot;";
        break;
      default:
        escaped += letter;
    }
  }
  return escaped;
}

// Nothing in it ends the element that it is in, or begins another.
std::string EscapeData(const std::string& json) {
  std::string escaped;
  escaped.reserve(json.size());
  for (const char letter : json) {
    if (letter == '<') {
      escaped += "\\u003c";
    } else {
      escaped += letter;
    }
  }
  return escaped;
}

// `page` with `text` in the place of the only `mark`.
void Fill(std::string& page, std::string_view mark, std::string_view text) {
  page.replace(page.find(mark), mark.size(), text);
}

}  // namespace

std::string MakePage(const std::string& title, const Json& report) {
  std::string page = Join(kPageFrame);
  const std::string style = Join(kPageStyle);
  const std::string script = Join(kPageScript);
  // What comes from the policy is filled in last, so that no mark is looked for in it.
  Fill(page, "{{script-source}}", SourceOf(script));
  Fill(page, "{{style-source}}", SourceOf(style));
  Fill(page, "{{style}}", style);
  Fill(page, "{{script}}", script);
  Fill(page, "{{data}}", EscapeData(report.Line()));
  Fill(page, "{{title}}", EscapeHtml(title));
  return page;
}

}  // namespace SecPolicyCli

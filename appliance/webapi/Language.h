#pragma once

#include <optional>
#include <string>
#include <string_view>

namespace orva {

// The language of an interface that asks for none that the appliance has texts in.
inline constexpr char kDefaultLanguage[] = "en";

// The texts of the interface, a folder for each language.
inline constexpr const char* kTextsDirectory = "/usr/orva/orvaman/webman/texts/";

// Whether `tag` has the form of a language tag: letters, then groups of letters and digits after
// "-" or "_". Such a text is safe as the name of a directory.
bool IsLanguageTag(std::string_view tag);

// The texts directory's name for the language `tag`: itself, or the language that it is a kind of
// ("de" for "de-AT"), with small letters where only those are there. Nothing when the tag is
// malformed or the appliance has no such texts.
std::optional<std::string> FindLanguage(std::string_view tag);

// The language to answer in: `asked`, the user's explicit choice, else the best of the header field
// `acceptLanguage` ("de-AT, de;q=0.9, en;q=0.5"). kDefaultLanguage when the choice, or everything
// in the header, is malformed or unknown.
std::string ChooseLanguage(std::optional<std::string_view> asked, std::string_view acceptLanguage);

}  // namespace orva

// The readers of the management interface's texts.
//
// Threads: parsed files are shared between threads and read again only when the file has changed;
// one object belongs to one thread at a time.
#pragma once

#include <json/value.h>

#include <memory>
#include <string>

namespace ORVA::ZUM {

// Finds the separately installed applications that bring texts of their own.
class JSConfigParser {
  public:
    explicit JSConfigParser(const std::string& language);

    // Reads apps/<name>/app.json of every installed application below the web root. An application
    // whose file is missing or damaged is left out, and one log line says so.
    void Parse();

    // An object: application id -> directory of that application's texts in this parser's language
    // ("en" where it has none in it), relative to the web root. Empty before Parse().
    Json::Value GetTexts() const;

  private:
    std::string language;
    Json::Value texts;
};

class LocalizedStringParser {
  public:
    // The texts of `directory`, an absolute path of the appliance: its file strings.json, an object
    // {section: {key: text}}. A section that is no object and a text that is no string are left
    // out, and one log line for each version of the file names the first of them. An empty object
    // when the file is missing, is not JSON or is no object. Never null. Everybody who asks while
    // the file stays the same shares one document.
    std::shared_ptr<const Json::Value> ParseTexts(const std::string& directory) const;
};

}  // namespace ORVA::ZUM

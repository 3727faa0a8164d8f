#pragma once

#include <json/value.h>

#include <memory>
#include <string>

#include "platform/texts.h"

namespace ORVA::Core::TaskScheduler {

// The texts of one interface language: those of the applications that own tasks, and the management
// interface's common ones. One is built per request and shows the texts as they were then.
class AppParser {
  public:
    // Reads the common texts of `language`, which becomes the name of a directory. Missing or
    // damaged files leave the catalogue empty; nothing is reported.
    explicit AppParser(const std::string& language);

    // A localisation key begins and ends with "#" and holds a ":".
    bool IsSectionKey(const std::string& text) const;

    // True for separately installed applications with texts of their own.
    bool Is3rdPartyApp(const std::string& app) const;

    // The text for the key `text`, the application's own before the common one; `text` itself when
    // it is no key or no text is known for it.
    std::string GetString(const std::string& app, const std::string& text) const;

  private:
    std::string language;
    ORVA::ZUM::JSConfigParser configParser;
    ORVA::ZUM::LocalizedStringParser textReader;
    Json::Value appTexts;
    std::shared_ptr<const Json::Value> commonTexts;
};

}  // namespace ORVA::Core::TaskScheduler

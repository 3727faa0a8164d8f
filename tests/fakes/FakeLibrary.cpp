// The utility library, the shares, the packages and the configuration of the recording platform.
#include <algorithm>
#include <cstring>
#include <map>
#include <string>
#include <vector>

#include "platform/conf.h"
#include "platform/package.h"
#include "platform/qlibc.h"
#include "platform/share.h"
#include "tests/fakes/RecordingPlatform.h"

namespace {

using Kind = fakes::RecordingPlatform::Kind;

fakes::RecordingPlatform& Platform() { return fakes::RecordingPlatform::Current(); }

struct StringList : QLIBC_SZLIST {
    std::vector<std::string> texts;
};

int Refuse(int code) {
    Platform().lastError = {code, "library.cpp", 1};
    return -1;
}

bool CopyOut(const std::string& text, char* buffer, int size) {
    if (size < 0 || text.size() >= static_cast<std::size_t>(size)) {
        return false;
    }
    std::memcpy(buffer, text.c_str(), text.size() + 1);
    return true;
}

std::string SingleQuoted(const std::string& text) {
    std::string quoted = "'";
    for (const char each : text) {
        quoted += each == '\'' ? "'\\''" : std::string(1, each);
    }
    return quoted + "'";
}

std::string Backslashed(const std::string& text) {
    static const std::string kPlain =
        "abcdefghijklmnopqrstuvwxyzABCDEFGHIJKLMNOPQRSTUVWXYZ0123456789_-./,:@%+=";
    std::string quoted;
    for (const char each : text) {
        if (each == '\n') {
            quoted += "'\n'";
        } else if (kPlain.find(each) == std::string::npos) {
            quoted += {'\\', each};
        } else {
            quoted += each;
        }
    }
    return quoted;
}

}  // namespace

struct QLIBC_SZHASH {
    std::map<std::string, std::string> values;
};

// --- Last error ---------------------------------------------------------------------------------

int QLIBCErrGet() { return Platform().lastError.code; }

const char* QLIBCErrorGetFile(int /*code*/) { return Platform().lastError.file.c_str(); }

int QLIBCErrorGetLine(int /*code*/) { return Platform().lastError.line; }

void QLIBCErrSetEx(int code, const char* file, int line) {
    Platform().Enter("QLIBCErrSetEx", std::to_string(code) + ", " + fakes::Quoted(file) + ", " +
                                          std::to_string(line));
    Platform().lastError = {code, file == nullptr ? "" : file, line};
}

// --- Texts --------------------------------------------------------------------------------------

int QLIBCStrReplace(char* buffer, const char* from, const char* to, int flags, int size) {
    if (Platform().Enter("QLIBCStrReplace", fakes::Quoted(buffer) + ", " + fakes::Quoted(from) +
                                                ", " + fakes::Quoted(to) + ", " +
                                                std::to_string(flags) + ", " +
                                                std::to_string(size))) {
        return -1;
    }
    if (buffer == nullptr || from == nullptr || *from == '\0' || to == nullptr) {
        return Refuse(0x0D00);
    }
    const std::size_t length = std::strlen(from);
    const std::string text = buffer;
    std::string result;
    int count = 0;
    std::size_t at = 0;
    for (std::size_t found = text.find(from); found != std::string::npos;
         found = text.find(from, at)) {
        result.append(text, at, found - at).append(to);
        at = found + length;
        ++count;
    }
    result.append(text, at);
    return CopyOut(result, buffer, size) ? count : Refuse(0x0E00);
}

int QLIBCEncShParam(const char* text, char* buffer, int size) {
    const bool fails =
        Platform().Enter("QLIBCEncShParam", fakes::Quoted(text) + ", " + std::to_string(size));
    if (Platform().emptyShellWord) {
        return 0;
    }
    if (fails) {
        return -1;
    }
    if (text == nullptr || buffer == nullptr) {
        return Refuse(0x0D00);
    }
    const std::string quoted = SingleQuoted(text);
    const std::size_t budget = 2 * std::strlen(text) + 2;
    if (quoted.size() < budget && CopyOut(quoted, buffer, size)) {
        return Platform().success;
    }
    return CopyOut(Backslashed(text), buffer, size) ? Platform().success : Refuse(0x0E00);
}

// --- String list --------------------------------------------------------------------------------

QLIBC_SZLIST* QLIBCSzListAlloc(int capacity) {
    if (Platform().Enter("QLIBCSzListAlloc", std::to_string(capacity))) {
        return nullptr;
    }
    auto* list = new StringList;
    list->count = 0;
    Platform().stringLists.Add(list);
    return list;
}

const char* QLIBCSzListGet(const QLIBC_SZLIST* list, int index) {
    if (Platform().Enter("QLIBCSzListGet",
                         Platform().stringLists.Name(list) + ", " + std::to_string(index),
                         Kind::kReader)) {
        return nullptr;
    }
    const auto& texts = static_cast<const StringList*>(list)->texts;
    return index < 0 || static_cast<std::size_t>(index) >= texts.size()
               ? nullptr
               : texts[static_cast<std::size_t>(index)].c_str();
}

int QLIBCSzListPush(QLIBC_SZLIST* list, const char* text) {
    if (Platform().Enter("QLIBCSzListPush",
                         Platform().stringLists.Name(list) + ", " + fakes::Quoted(text))) {
        return -1;
    }
    static_cast<StringList*>(list)->texts.emplace_back(text);
    return ++list->count;
}

void QLIBCSzListFree(QLIBC_SZLIST* list) {
    Platform().Enter("QLIBCSzListFree", Platform().stringLists.Name(list));
    if (Platform().stringLists.Remove(list)) {
        delete static_cast<StringList*>(list);
    }
}

// --- String hash --------------------------------------------------------------------------------

QLIBC_SZHASH* QLIBCSzHashAlloc(int size) {
    if (Platform().Enter("QLIBCSzHashAlloc", std::to_string(size))) {
        return nullptr;
    }
    auto* hash = new QLIBC_SZHASH;
    Platform().hashes.Add(hash);
    return hash;
}

int QLIBCSzHashSetValue(QLIBC_SZHASH** hash, const char* key, const char* value) {
    if (Platform().Enter("QLIBCSzHashSetValue", Platform().hashes.Name(*hash) + ", " +
                                                    fakes::Quoted(key) + ", " +
                                                    fakes::Quoted(value))) {
        return -1;
    }
    // A table may move whenever it is written to: a caller that kept the old address shows up.
    auto* moved = new QLIBC_SZHASH(**hash);
    moved->values[key] = value;
    const int number = Platform().hashes.live[*hash];
    Platform().hashes.live.erase(*hash);
    delete *hash;
    *hash = moved;
    Platform().hashes.live[moved] = number;
    return Platform().success;
}

const char* QLIBCSzHashGetValue(const QLIBC_SZHASH* hash, const char* key) {
    if (Platform().Enter("QLIBCSzHashGetValue",
                         Platform().hashes.Name(hash) + ", " + fakes::Quoted(key), Kind::kReader)) {
        return nullptr;
    }
    const auto found = hash->values.find(key);
    return found == hash->values.end() ? nullptr : found->second.c_str();
}

void QLIBCSzHashFree(QLIBC_SZHASH* hash) {
    Platform().Enter("QLIBCSzHashFree", Platform().hashes.Name(hash));
    if (Platform().hashes.Remove(hash)) {
        delete hash;
    }
}

// --- Shares -------------------------------------------------------------------------------------

int ORVAShareEnum(QLIBC_SZLIST* list, int kinds) {
    if (Platform().Enter("ORVAShareEnum",
                         Platform().stringLists.Name(list) + ", " + std::to_string(kinds))) {
        return -1;
    }
    for (const std::string& share : Platform().shares) {
        static_cast<StringList*>(list)->texts.push_back(share);
        ++list->count;
    }
    return static_cast<int>(Platform().shares.size());
}

int ORVARecycleStatusSet(const char* share, int enabled) {
    if (Platform().Enter("ORVARecycleStatusSet",
                         fakes::Quoted(share) + ", " + std::to_string(enabled))) {
        return -1;
    }
    const auto& shares = Platform().shares;
    return std::find(shares.begin(), shares.end(), share) != shares.end() ? Platform().success
                                                                          : Refuse(0x0300);
}

// --- Packages -----------------------------------------------------------------------------------

namespace ORVAPackageTool {

bool PackageManager::init() {
    if (Platform().Enter("PackageManager::init", "")) {
        return false;
    }
    for (const auto& [id, info] : Platform().packages) {
        ids.push_back(id);
    }
    for (const std::string& id : Platform().damagedPackages) {
        ids.push_back(id);
    }
    ids.sort();
    ids.unique();
    return true;
}

std::list<std::string> PackageManager::enumPackages(const PackageFilter* filter) const {
    if (Platform().Enter("PackageManager::enumPackages", filter == nullptr ? "null" : "filter")) {
        return {};
    }
    return ids;
}

bool PackageManager::getPackageInfo(const std::string& id, PackageInfo& info,
                                    const PackageQuery* query) const {
    if (Platform().Enter("PackageManager::getPackageInfo",
                         fakes::Quoted(id) + ", " + (query == nullptr ? "null" : "query"))) {
        return false;
    }
    const auto found = Platform().packages.find(id);
    if (found == Platform().packages.end() || Platform().damagedPackages.contains(id)) {
        return false;
    }
    info = found->second;
    return true;
}

}  // namespace ORVAPackageTool

// --- Configuration ------------------------------------------------------------------------------

struct OrvaConf::Values {};

OrvaConf::OrvaConf() { Platform().Enter("OrvaConf", "", Kind::kTexts); }

std::string OrvaConf::Def(const std::string& key, const std::string& defaultValue) const {
    if (Platform().Enter("OrvaConf::Def", fakes::Quoted(key) + ", " + fakes::Quoted(defaultValue),
                         Kind::kTexts)) {
        return defaultValue;
    }
    const auto found = Platform().configuration.find(key);
    return found == Platform().configuration.end() ? defaultValue : found->second;
}

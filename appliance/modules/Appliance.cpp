// The API ORVA.Core.Appliance: what the task editor needs to know of the machine.
#include <json/value.h>
#include <unistd.h>

#include <array>
#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "appliance/modules/ApiMethod.h"
#include "appliance/modules/CleanPreview.h"
#include "appliance/modules/LoginAccounts.h"
#include "appliance/runs/RunDocument.h"
#include "appliance/runs/RunStore.h"
#include "appliance/schedule/StartText.h"
#include "appliance/share/ShareRegistry.h"
#include "appliance/store/SchedulerLink.h"
#include "appliance/store/TaskStore.h"
#include "appliance/tools/Buzzer.h"
#include "appliance/webapi/Language.h"
#include "platform/texts.h"
#include "platform/webapi.h"

namespace {

using orva::Parameters;

constexpr const char* kApiName = "ORVA.Core.Appliance";

Json::Value Shares(const Parameters& /*parameters*/) {
    const std::optional<std::vector<orva::Share>> shares = orva::ShareRegistry().List();
    if (!shares) {
        throw orva::ApiFailure(orva::ModuleError::kStoreFailed,
                               "the registry of shared folders cannot be read");
    }
    Json::Value answer(Json::objectValue);
    Json::Value& list = answer["shares"] = Json::Value(Json::arrayValue);
    for (const orva::Share& share : *shares) {
        Json::Value each(Json::objectValue);
        each["name"] = share.name;
        each["recycle"] = share.recycleBin;
        list.append(std::move(each));
    }
    return answer;
}

Json::Value Owners(const Parameters& /*parameters*/) {
    Json::Value answer(Json::objectValue);
    Json::Value& list = answer["owners"] = Json::Value(Json::arrayValue);
    for (const std::string& account : orva::LoginAccounts()) {
        list.append(account);
    }
    return answer;
}

Json::Value Texts(const Parameters& parameters) {
    Json::Value answer(Json::objectValue);
    answer["language"] = parameters.Language();
    answer["texts"] = *ORVA::ZUM::LocalizedStringParser().ParseTexts(orva::kTextsDirectory +
                                                                     parameters.Language());
    return answer;
}

std::string HostName() {
    std::array<char, 256> name{};
    return ::gethostname(name.data(), name.size() - 1) == 0 ? name.data() : "";
}

Json::Value Info(const Parameters& /*parameters*/) {
    const std::shared_ptr<orva::TaskStore> store = orva::TaskStore::Current();
    Json::Value answer(Json::objectValue);
    answer["name"] = HostName();
    answer["version"] = ORVA_VERSION;
    answer["time"] = orva::FormatInstant(store->Now());
    answer["zone"] = orva::ZoneName(store->Zone());
    answer["scheduler"] = orva::SchedulerLink::IsAlive();
    answer["buzzer"] = orva::HasBuzzer();
    return answer;
}

Json::Value Revision(const Parameters& /*parameters*/) {
    Json::Value answer(Json::objectValue);
    answer["revision"] = Json::Int64{orva::RunStore::Current()->Revision()};
    answer["scheduler"] = orva::SchedulerLink::IsAlive();
    return answer;
}

const ORVA::APITableRow kTable[] = {
    {kApiName, 1, "shares", orva::Serve<Shares>},
    {kApiName, 1, "owners", orva::Serve<Owners>},
    {kApiName, 1, "texts", orva::Serve<Texts>},
    {kApiName, 1, "info", orva::Serve<Info>},
    {kApiName, 1, "clean_preview", orva::Serve<orva::CleanPreview>},
    {kApiName, 1, "revision", orva::Serve<Revision>},
    {nullptr, 0, nullptr, nullptr},
};

}  // namespace

__attribute__((visibility("default"))) const ORVA::APITableRow* GetAPITable() { return kTable; }

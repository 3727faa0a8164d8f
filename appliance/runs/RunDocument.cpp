#include "appliance/runs/RunDocument.h"

namespace orva {
namespace {

Json::Value InstantOrNull(const std::optional<absl::Time>& time) {
    return time ? Json::Value(FormatInstant(*time)) : Json::Value();
}

Json::Value IntegerOrNull(const std::optional<int>& number) {
    return number ? Json::Value(*number) : Json::Value();
}

}  // namespace

std::string FormatInstant(absl::Time time) {
    return absl::FormatTime("%Y-%m-%dT%H:%M:%E3SZ", time, absl::UTCTimeZone());
}

Json::Value RunDocument(const Run& run) {
    Json::Value document(Json::objectValue);
    document["run"] = Json::Int64{run.id};
    document["task"] = run.task;
    document["name"] = run.taskName;
    document["reason"] = std::string(RunReasonText(run.reason));
    document["state"] = std::string(RunStateText(run.state));
    document["why"] = run.why;
    document["asked_program"] = run.askedProgram;
    document["asked_account"] = run.askedAccount;
    document["occurrence"] = InstantOrNull(run.occurrence);
    document["queued"] = FormatInstant(run.queuedAt);
    document["started"] = InstantOrNull(run.startedAt);
    document["ended"] = InstantOrNull(run.endedAt);
    document["exit_status"] = IntegerOrNull(run.exitStatus);
    document["signal"] = IntegerOrNull(run.signal);
    document["output"] = Json::UInt64{run.outputBytes};
    return document;
}

}  // namespace orva

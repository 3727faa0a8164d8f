#include "tests/system/TypedTasks.h"

#include <json/json.h>

#include <filesystem>
#include <memory>

#include "tests/system/Process.h"

namespace orva::test {
namespace {

constexpr const char* kTexts = R"({
    "backup": {"title": "Job"},
    "common": {"run": "Run", "time_seconds": "seconds", "start_service": "Start services",
               "stop_service": "Stop services"},
    "network": {"wnds_file_service": "Windows file service"},
    "nfs": {"nfs_title": "NFS service"},
    "schedule": {"clean_recycle_bin": "Empty recycle bins"},
    "share": {"share_clean_all_recycle_bin": "Empty all recycle bins"},
    "volume": {"beep_on": "Beep for"}})";

constexpr const char* kShares = R"({"shares": [
    {"name": "photo", "path": "/volume1/photo", "kind": 1, "recycle_bin": false},
    {"name": "video", "path": "/volume1/video", "kind": 2, "recycle_bin": false},
    {"name": "web site", "path": "/volume2/web site", "kind": 256, "recycle_bin": false}]})";

}  // namespace

TypedTasksTest::TypedTasksTest() : server({ORVA_LIB_DIR "/ORVA.Core.TaskScheduler.so"}) {
    const Sandbox& root = server.Root();
    std::filesystem::create_directories(root.Path() / "usr/orva/var");
    for (const char* share : {"volume1/photo", "volume1/video", "volume2/web site"}) {
        std::filesystem::create_directories(root.Path() / share);
    }
    root.Write("usr/orva/etc/shares.json", kShares);
    root.Write("usr/orva/orvaman/webman/texts/en/strings.json", kTexts);
    Install("Notes", R"({"display_name": "Note Station", "startable": true})");
    Install("Wiki", R"({"display_name": "Wiki Pages", "startable": true})");
    server.Start();
}

HttpAnswer TypedTasksTest::Call(const std::string& method, const std::string& body) const {
    return server.Post("ORVA.Core.TaskScheduler/1/" + method, body);
}

std::string TypedTasksTest::Body(const std::string& method, const std::string& body) const {
    const HttpAnswer answer = Call(method, body);
    EXPECT_EQ(answer.status, 200) << method << " " << body;
    return answer.body;
}

void TypedTasksTest::Import(const std::string& tasks) const {
    const ProcessResult result = RunProcess(
        {ORVA_BIN_DIR "/orvaschedtool", "--root", server.Root().Path().string(), "--import", "-"},
        tasks);
    EXPECT_EQ(result.status, 0) << result.err;
}

std::string TypedTasksTest::Records() const {
    const ProcessResult result = RunProcess(
        {ORVA_BIN_DIR "/orvaschedtool", "--root", server.Root().Path().string(), "--export"});
    EXPECT_EQ(result.status, 0) << result.err;
    return Compact(result.out);
}

void TypedTasksTest::Install(const std::string& id, const std::string& description) const {
    server.Root().Write("usr/orva/packages/" + id + "/package.json", description);
}

std::string Compact(const std::string& json) {
    const std::unique_ptr<Json::CharReader> reader(Json::CharReaderBuilder().newCharReader());
    Json::Value document;
    std::string error;
    EXPECT_TRUE(reader->parse(json.data(), json.data() + json.size(), &document, &error))
        << error << " in " << json;
    Json::StreamWriterBuilder builder;
    builder["indentation"] = "";
    builder["emitUTF8"] = true;
    return Json::writeString(builder, document);
}

std::string Success(const std::string& data) {
    return R"({"success":true,"data":)" + Compact(data) + "}";
}

std::string Failure(int code, const std::string& details) {
    return R"({"success":false,"error":{"code":)" + std::to_string(code) + R"(,"details":)" +
           Compact(details) + "}}";
}

}  // namespace orva::test

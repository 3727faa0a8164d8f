#include "tests/system/RunningServer.h"

#include <gtest/gtest.h>
#include <json/json.h>

#include <filesystem>
#include <stdexcept>

namespace orva::test {

RunningServer::RunningServer(const std::vector<std::string>& modules) {
    for (const char* language : {"en", "de", "ja"}) {
        std::filesystem::create_directories(sandbox.Path() / "usr/orva/orvaman/webman/texts" /
                                            language);
    }
    const std::filesystem::path library = sandbox.Path() / "usr/orva/lib";
    std::filesystem::create_directories(library);
    for (const std::filesystem::path module : modules) {
        std::filesystem::create_symlink(module, library / module.filename());
    }
}

std::vector<std::string> RunningServer::Arguments(const std::string& listen) const {
    return {ORVA_BIN_DIR "/orva-webapid", "--root", sandbox.Path().string(), "--listen", listen};
}

void RunningServer::Start(const std::vector<std::string>& moreArguments,
                          const std::string& listen) {
    std::vector<std::string> arguments = Arguments(listen);
    arguments.insert(arguments.end(), moreArguments.begin(), moreArguments.end());
    process = std::make_unique<ServerProcess>(arguments);
    if (!process->Ready()) {
        throw std::runtime_error("the server does not start: " + process->ErrorText());
    }
}

std::string RunningServer::Token() const {
    return ReadWholeFile(sandbox.Path() / "usr/orva/etc/webapi.token").substr(0, 64);
}

HttpAnswer RunningServer::Ask(const std::string& request) const {
    HttpConnection connection = Connect();
    connection.Send(request);
    return connection.Receive().value_or(HttpAnswer());
}

HttpAnswer RunningServer::Post(std::string_view method, std::string_view body) const {
    return Ask(PostRequest("/webapi/" + std::string(method), Token(), body));
}

Json::Value AnswerDocument(const HttpAnswer& answer) {
    Json::CharReaderBuilder builder;
    Json::CharReaderBuilder::strictMode(&builder.settings_);
    const std::unique_ptr<Json::CharReader> reader(builder.newCharReader());
    Json::Value document;
    std::string error;
    const char* begin = answer.body.data();
    EXPECT_TRUE(reader->parse(begin, begin + answer.body.size(), &document, &error))
        << error << " in " << answer.body;
    EXPECT_TRUE(document.isObject() && document["success"].isBool() &&
                document.isMember(document["success"].asBool() ? "data" : "error"))
        << answer.body;
    return document;
}

int ErrorCode(const HttpAnswer& answer) {
    const Json::Value document = AnswerDocument(answer);
    return document.isObject() && document.isMember("error") ? document["error"]["code"].asInt()
                                                             : 0;
}

}  // namespace orva::test

// An API module for tests, with a method for each way in which a method can end.
#include <fcntl.h>
#include <unistd.h>

#include <stdexcept>

#include "platform/webapi.h"

namespace {

// Answers the parameters and the language that it got.
void Echo(ORVA::APIRequest* request, ORVA::APIResponse* response) {
    Json::Value answer;
    answer["parameters"] = request->GetParam("", Json::Value());
    answer["language"] = request->GetUILanguage();
    response->SetSuccess(answer);
}

void Refuse(ORVA::APIRequest* request, ORVA::APIResponse* response) {
    response->SetError(4800, request->GetParam("details", Json::Value()));
}

void Throw(ORVA::APIRequest*, ORVA::APIResponse* response) {
    response->SetSuccess(Json::Value("half done"));
    throw std::runtime_error("the disk is on fire");
}

void ThrowOdd(ORVA::APIRequest*, ORVA::APIResponse*) { throw 42; }

// jsoncpp throws for a text that is read as a number.
void ReadNumber(ORVA::APIRequest* request, ORVA::APIResponse* response) {
    response->SetSuccess(request->GetParam("number", Json::Value()).asInt());
}

void SayNothing(ORVA::APIRequest*, ORVA::APIResponse*) {}

void BrokenText(ORVA::APIRequest*, ORVA::APIResponse* response) {
    response->SetSuccess(Json::Value("a\xFFz"));
}

// Says that it runs by opening the named pipe "pipe" for reading, and answers when the other side
// has closed it.
void Wait(ORVA::APIRequest* request, ORVA::APIResponse* response) {
    const std::string pipe = request->GetParam("pipe", "").asString();
    const int fd = ::open(pipe.c_str(), O_RDONLY | O_CLOEXEC);
    char byte = 0;
    while (::read(fd, &byte, 1) > 0) {
    }
    ::close(fd);
    response->SetSuccess(Json::Value("waited"));
}

// Answers a text of "bytes" bytes.
void Large(ORVA::APIRequest* request, ORVA::APIResponse* response) {
    const auto bytes = static_cast<std::size_t>(request->GetParam("bytes", 0).asUInt());
    response->SetSuccess(Json::Value(std::string(bytes, 'x')));
}

const ORVA::APITableRow kTable[] = {
    {"Test.Echo", 1, "echo", &Echo},
    {"Test.Echo", 1, "refuse", &Refuse},
    {"Test.Echo", 1, "throw", &Throw},
    {"Test.Echo", 1, "throw_odd", &ThrowOdd},
    {"Test.Echo", 1, "read_number", &ReadNumber},
    {"Test.Echo", 1, "say_nothing", &SayNothing},
    {"Test.Echo", 1, "broken_text", &BrokenText},
    {"Test.Echo", 1, "wait", &Wait},
    {"Test.Echo", 2, "large", &Large},
    {nullptr, 0, nullptr, nullptr},
};

}  // namespace

const ORVA::APITableRow* GetAPITable() { return kTable; }

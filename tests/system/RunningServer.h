// An appliance of its own with the real web-API server running in it.
#pragma once

#include <json/value.h>

#include <memory>
#include <string>
#include <string_view>
#include <vector>

#include "tests/system/HttpClient.h"
#include "tests/system/Process.h"

namespace orva::test {

class RunningServer {
  public:
    // Prepares the appliance; it has texts in English, German and Japanese. `modules` are the full
    // paths of the API modules that the server will find.
    explicit RunningServer(const std::vector<std::string>& modules);

    // Starts the server on a free port, or as `listen` says. Fails the test when it does not start.
    void Start(const std::vector<std::string>& moreArguments = {},
               const std::string& listen = "127.0.0.1:0");

    const Sandbox& Root() const { return sandbox; }
    ServerProcess& Process() { return *process; }
    const std::string& Url() const { return process->ReadyDetail(); }
    // The access token; the server has made it.
    std::string Token() const;

    HttpConnection Connect() const { return HttpConnection(Url()); }
    // Sends a request on a connection of its own. Status 0 when there was no answer.
    HttpAnswer Ask(const std::string& request) const;
    // POST of `body` to /webapi/`method`, with the token.
    HttpAnswer Post(std::string_view method, std::string_view body) const;

    std::vector<std::string> Arguments(const std::string& listen) const;

  private:
    Sandbox sandbox;
    std::unique_ptr<ServerProcess> process;
};

// The answer's body as a document. Fails the test when it is not JSON in the common form of
// answers.
Json::Value AnswerDocument(const HttpAnswer& answer);

// The error code of an answer; 0 for a success.
int ErrorCode(const HttpAnswer& answer);

}  // namespace orva::test

#pragma once

#include <optional>
#include <string>

#include "appliance/server/AccessToken.h"
#include "appliance/server/HttpServer.h"
#include "appliance/webapi/Dispatcher.h"

namespace orva {

// The places of the web API:
//   POST /webapi/{api}/{version}/{method}   a call; the body is a JSON object of parameters
//   GET  /webapi                            which APIs, versions and methods there are
// Both need the token, both answer JSON in the form of WriteAnswer().
//
// Threads: any. Owns nothing of what it is given; all of that outlives it.
class Router : public HttpHandler {
  public:
    Router(const Dispatcher& dispatcher, const AccessToken& token);

    std::optional<HttpResponse> Admit(const HttpRequest& request) override;
    HttpResponse Serve(const HttpRequest& request) override;
    HttpResponse Refuse(int status, const std::string& reason) override;

  private:
    std::optional<HttpResponse> CheckToken(const HttpRequest& request) const;

    const Dispatcher& dispatcher;
    const AccessToken& token;
};

}  // namespace orva

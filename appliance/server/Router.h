#pragma once

#include <cstddef>
#include <optional>
#include <string>

#include "appliance/server/Authenticator.h"
#include "appliance/server/HttpServer.h"
#include "appliance/server/PageFiles.h"
#include "appliance/webapi/Dispatcher.h"

namespace orva {

// The places of the server:
//   POST /webapi/{api}/{version}/{method}   a call; the body is a JSON object of parameters
//   GET  /webapi                            which APIs, versions and methods there are
//   GET, POST, DELETE /session              whether a browser has signed in; sign in; sign out
//   GET  /...                               the browser page
// The first two are for who may use the API. All but the page answer JSON in the form of
// WriteAnswer().
//
// Threads: any. Owns nothing of what it is given; all of that outlives it.
class Router : public HttpHandler {
  public:
    Router(const Dispatcher& dispatcher, Authenticator& authenticator, const PageFiles& page);

    std::optional<HttpResponse> Admit(const HttpRequest& request) override;
    std::size_t LargestBody(const HttpRequest& request) const override;
    HttpResponse Serve(const HttpRequest& request) override;
    HttpResponse Refuse(int status, const std::string& reason) override;

  private:
    HttpResponse ShowPage(const HttpRequest& request) const;

    const Dispatcher& dispatcher;
    Authenticator& authenticator;
    const PageFiles& page;
};

}  // namespace orva

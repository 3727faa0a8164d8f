#pragma once

#include <cstddef>
#include <optional>
#include <string>
#include <string_view>

#include "appliance/server/AccessToken.h"
#include "appliance/server/GuessLimit.h"
#include "appliance/server/HttpMessage.h"
#include "appliance/server/SessionTable.h"
#include "appliance/server/SignInCode.h"

namespace orva {

// Who may use the web API: programs that send the token with each request, and browsers that have
// exchanged the token or a sign-in code for a cookie at /session.
//
// Threads: any. The token outlives it.
class Authenticator {
  public:
    // The largest document that signs anybody in, in bytes. What arrives there comes from
    // strangers.
    static constexpr std::size_t kLargestSignIn = 4096;

    // `overTls`: callers reach the server by https, so that cookies may travel no other way and a
    // page's origin begins so.
    Authenticator(const AccessToken& token, bool overTls, const BootClock& clock = BootTime);

    // Why the caller may not use the API; nothing when it may. A request with an Authorization
    // field counts by that field alone. A request that a browser signed by its cookie and that may
    // change something must come from a page of this very server, as its Origin says.
    std::optional<HttpResponse> Refuse(const HttpRequest& request);

    // What there is at /session. GET and DELETE are answered at once; a POST is refused here or
    // answered by SignIn() when its body is there.
    std::optional<HttpResponse> AdmitSession(const HttpRequest& request);

    // The cookie for {"token": ...} or {"code": ...}, or why there is none.
    HttpResponse SignIn(const HttpRequest& request);

  private:
    std::optional<HttpResponse> RefuseToken(const HttpRequest& request, std::string_view field);
    std::optional<HttpResponse> RefuseOrigin(const HttpRequest& request, bool needed) const;
    std::optional<std::string_view> OpenSession(const HttpRequest& request);
    void EndSessions(const HttpRequest& request);
    HttpResponse SignOut(const HttpRequest& request);
    std::string Cookie(std::string_view value, std::chrono::seconds lifetime) const;

    const AccessToken& token;
    const bool overTls;
    GuessLimit limit;
    SessionTable sessions;
    SignInCodes codes;
};

}  // namespace orva

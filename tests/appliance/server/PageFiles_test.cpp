#include "appliance/server/PageFiles.h"

#include <gtest/gtest.h>
#include <sys/stat.h>
#include <unistd.h>

#include <filesystem>
#include <string>

#include "tests/appliance/server/Requests.h"
#include "tests/system/Process.h"

namespace {

using orva::HttpResponse;
using orva::PageFiles;
using orva::test::HeaderOf;
using orva::test::MakeRequest;
using Headers = std::vector<std::pair<std::string_view, std::string_view>>;

class PageFilesTest : public testing::Test {
  protected:
    PageFilesTest() {
        Write("index.html", "<!doctype html>");
        Write("assets/app-Ab3_d-9Z.js", "run()");
    }

    void Write(const std::string& name, const std::string& content) const {
        sandbox.Write("page/" + name, content);
    }

    std::optional<HttpResponse> Find(const std::string& target, const Headers& headers = {}) const {
        return page.Find(MakeRequest("GET", target, headers));
    }

    // What is sent for the target; "(none)" when there is nothing.
    std::string Content(const std::string& target, const Headers& headers = {}) const {
        const std::optional<HttpResponse> answer = Find(target, headers);
        if (!answer) {
            return "(none)";
        }
        std::string content(answer->fileSize, '\0');
        EXPECT_EQ(::read(answer->file.Get(), content.data(), content.size()),
                  static_cast<ssize_t>(content.size()));
        return content;
    }

    std::string Header(const std::string& target, const std::string& name,
                       const Headers& headers = {}) const {
        const std::optional<HttpResponse> answer = Find(target, headers);
        return answer ? HeaderOf(*answer, name) : "(no file)";
    }

    orva::test::Sandbox sandbox;
    PageFiles page{(sandbox.Path() / "page").string()};
};

TEST_F(PageFilesTest, HasTheFilesOfItsFolder) {
    EXPECT_EQ(Content("/index.html"), "<!doctype html>");
    EXPECT_EQ(Content("/"), "<!doctype html>");
    EXPECT_EQ(Content("/?lang=de"), "<!doctype html>");
    EXPECT_EQ(Content("/assets/app-Ab3_d-9Z.js"), "run()");
    EXPECT_EQ(Content("/assets/app%2DAb3_d-9Z.js"), "run()");
    EXPECT_EQ(Find("/")->status, 200);
}

TEST_F(PageFilesTest, HasNothingElse) {
    sandbox.Write("outside.html", "outside");
    Write(".hidden.html", "hidden");
    Write(".git/page.html", "hidden");
    Write("assets/.hidden.js", "hidden");
    Write("folder.html/file.html", "in a folder");
    for (const char* target : {"/none.html",
                               "/assets",
                               "/assets/",
                               "//index.html",
                               "/./index.html",
                               "/../outside.html",
                               "/..%2foutside.html",
                               "/%2e%2e/outside.html",
                               "/assets/../../outside.html",
                               "/assets/%2e%2e/index.html",
                               "/.hidden.html",
                               "/.git/page.html",
                               "/assets/.hidden.js",
                               "/folder.html",
                               "/index.html/",
                               "/index.html/index.html",
                               "/Index.html",
                               "/.",
                               "/..",
                               "/.html"}) {
        EXPECT_EQ(Content(target), "(none)") << target;
    }
    EXPECT_EQ(Content("/folder.html/file.html"), "in a folder");
}

TEST_F(PageFilesTest, FollowsNoLinks) {
    sandbox.Write("outside.html", "outside");
    const std::filesystem::path folder = sandbox.Path() / "page";
    std::filesystem::create_symlink("../outside.html", folder / "out.html");
    std::filesystem::create_symlink("index.html", folder / "in.html");
    std::filesystem::create_directory_symlink("..", folder / "up");
    EXPECT_EQ(Content("/out.html"), "(none)");
    EXPECT_EQ(Content("/in.html"), "(none)");
    EXPECT_EQ(Content("/up/outside.html"), "(none)");
}

TEST_F(PageFilesTest, GivesOutOnlyWhatAPageIsMadeOf) {
    struct Kind {
        const char* name;
        const char* type;
    };
    for (const Kind& kind :
         {Kind{"a.html", "text/html; charset=utf-8"},
          Kind{"a.js", "text/javascript; charset=utf-8"}, Kind{"a.css", "text/css; charset=utf-8"},
          Kind{"a.json", "application/json; charset=utf-8"}, Kind{"a.svg", "image/svg+xml"},
          Kind{"a.png", "image/png"}, Kind{"a.ico", "image/x-icon"},
          Kind{"a.woff2", "font/woff2"}}) {
        Write(kind.name, "x");
        EXPECT_EQ(Header(std::string("/") + kind.name, "Content-Type"), kind.type) << kind.name;
    }
    for (const char* name : {"a.js.map", "a.js.gz", "a", "a.txt", "a.HTML", "ahtml"}) {
        Write(name, "x");
        EXPECT_EQ(Content(std::string("/") + name), "(none)") << name;
    }
}

TEST_F(PageFilesTest, WaitsForNoPipe) {
    ASSERT_EQ(::mkfifo((sandbox.Path() / "page/pipe.html").c_str(), 0600), 0);
    EXPECT_EQ(Content("/pipe.html"), "(none)");
}

TEST_F(PageFilesTest, LetsOnlyFilesBeKeptWhoseNameHoldsADigest) {
    EXPECT_EQ(Header("/", "Cache-Control"), "no-store");
    EXPECT_EQ(Header("/index.html", "Cache-Control"), "no-store");
    EXPECT_EQ(Header("/assets/app-Ab3_d-9Z.js", "Cache-Control"),
              "public, max-age=31536000, immutable");
    for (const char* name :
         {"app-Ab3_d-9Z.js", "assets/app.js", "assets/app-Ab3.js", "assets/appAb3_d9Zx.js",
          "assets/-Ab3_d-9Z.js", "assets/app-Ab3_d.9Z.js", "favicon.svg"}) {
        Write(name, "x");
        EXPECT_EQ(Header(std::string("/") + name, "Cache-Control"), "no-cache") << name;
    }
    Write("assets/page-Ab3_d-9Z.html", "x");
    EXPECT_EQ(Header("/assets/page-Ab3_d-9Z.html", "Cache-Control"), "no-store");
}

TEST_F(PageFilesTest, TellsBrowsersWhatThePageMayDo) {
    EXPECT_EQ(Header("/", "Content-Security-Policy"),
              "default-src 'self'; object-src 'none'; base-uri 'none'; form-action 'none'; "
              "frame-ancestors 'none'");
    EXPECT_EQ(Header("/", "X-Content-Type-Options"), "nosniff");
    EXPECT_EQ(Header("/", "Referrer-Policy"), "no-referrer");
    EXPECT_EQ(Header("/", "Cross-Origin-Opener-Policy"), "same-origin");
    EXPECT_EQ(Header("/", "Cross-Origin-Resource-Policy"), "same-origin");
}

TEST_F(PageFilesTest, SendsNoFileThatTheCallerHasAlready) {
    const std::string tag = Header("/", "ETag");
    ASSERT_EQ(tag.size(), 26U);
    EXPECT_EQ(tag.front(), '"');
    EXPECT_EQ(tag.back(), '"');
    for (const std::string& known : {tag, "W/" + tag, "\"other\", " + tag,
                                     "\"other\"," + tag + " ,\"third\"", std::string("*")}) {
        const std::optional<HttpResponse> answer = Find("/", {{"If-None-Match", known}});
        EXPECT_EQ(answer->status, 304) << known;
        EXPECT_EQ(HeaderOf(*answer, "ETag"), tag);
        EXPECT_EQ(HeaderOf(*answer, "Cache-Control"), "no-store");
    }
    for (const std::string& known :
         {std::string(), std::string("\"other\""), tag.substr(1), "x" + tag}) {
        EXPECT_EQ(Find("/", {{"If-None-Match", known}})->status, 200) << known;
    }
}

TEST_F(PageFilesTest, HasAnotherTagForAnotherFile) {
    const std::string tag = Header("/", "ETag");
    EXPECT_EQ(Header("/", "ETag"), tag);
    EXPECT_NE(Header("/assets/app-Ab3_d-9Z.js", "ETag"), tag);
    // The same size and content, in the place of the former one.
    Write("new", "<!doctype html>");
    std::filesystem::rename(sandbox.Path() / "page/new", sandbox.Path() / "page/index.html");
    EXPECT_NE(Header("/", "ETag"), tag);
}

TEST_F(PageFilesTest, SendsTheCompressedFileToWhoeverTakesIt) {
    Write("assets/app-Ab3_d-9Z.js.gz", "compressed");
    const std::string target = "/assets/app-Ab3_d-9Z.js";
    for (const char* accepted : {"gzip", "GZIP", "deflate, gzip", "br;q=1.0, gzip;q=0.5", "*",
                                 "gzip;q=0.001", "gzip ; q=1"}) {
        const Headers headers = {{"Accept-Encoding", accepted}};
        EXPECT_EQ(Content(target, headers), "compressed") << accepted;
        EXPECT_EQ(Header(target, "Content-Encoding", headers), "gzip");
        EXPECT_EQ(Header(target, "Vary", headers), "Accept-Encoding");
        EXPECT_EQ(Header(target, "Content-Type", headers), "text/javascript; charset=utf-8");
        EXPECT_NE(Header(target, "ETag", headers), Header(target, "ETag"));
    }
    for (const char* accepted :
         {"", "br", "identity", "gzip;q=0", "gzip; q=0.000", "xgzip", "gzip2"}) {
        const Headers headers = {{"Accept-Encoding", accepted}};
        EXPECT_EQ(Content(target, headers), "run()") << accepted;
        EXPECT_EQ(Header(target, "Content-Encoding", headers), "(none)");
        EXPECT_EQ(Header(target, "Vary", headers), "Accept-Encoding");
    }
    EXPECT_EQ(Header("/", "Vary", {{"Accept-Encoding", "gzip"}}), "(none)");
}

TEST_F(PageFilesTest, SendsNoCompressedFileAlone) {
    Write("alone.js.gz", "compressed");
    EXPECT_EQ(Content("/alone.js", {{"Accept-Encoding", "gzip"}}), "(none)");
}

TEST_F(PageFilesTest, IsEmptyWhereNoPageIs) {
    const PageFiles none((sandbox.Path() / "none").string());
    EXPECT_FALSE(none.Find(MakeRequest("GET", "/")).has_value());
    const PageFiles noFolder((sandbox.Path() / "page/index.html").string());
    EXPECT_FALSE(noFolder.Find(MakeRequest("GET", "/index.html")).has_value());
}

}  // namespace

#include "appliance/server/PageFiles.h"

#include <fcntl.h>
#include <sys/stat.h>

#include <algorithm>
#include <array>
#include <string_view>

#include "appliance/server/OpenBeneath.h"
#include "appliance/server/Secret.h"
#include "appliance/util/Text.h"

namespace orva {
namespace {

struct FileKind {
    std::string_view ending;
    const char* contentType;
};

constexpr FileKind kKinds[] = {
    {".html", "text/html; charset=utf-8"},
    {".js", "text/javascript; charset=utf-8"},
    {".css", "text/css; charset=utf-8"},
    {".json", "application/json; charset=utf-8"},
    {".svg", "image/svg+xml"},
    {".png", "image/png"},
    {".ico", "image/x-icon"},
    {".woff2", "font/woff2"},
};

// Everything comes from files of this server, and nothing in the page's own text is run.
constexpr char kContentSecurityPolicy[] =
    "default-src 'self'; object-src 'none'; base-uri 'none'; form-action 'none'; "
    "frame-ancestors 'none'";

constexpr char kImmutable[] = "public, max-age=31536000, immutable";
constexpr char kRevalidated[] = "no-cache";
constexpr char kNeverKept[] = "no-store";

bool EndsWith(std::string_view text, std::string_view ending) {
    return text.size() >= ending.size() && text.substr(text.size() - ending.size()) == ending;
}

const FileKind* FindKind(std::string_view path) {
    const auto* kind = std::find_if(std::begin(kKinds), std::end(kKinds),
                                    [path](const auto& k) { return EndsWith(path, k.ending); });
    return kind == std::end(kKinds) ? nullptr : kind;
}

// "assets/app-Ab3_d9-Z.js" as it is below the page's folder; empty when no file may be called so.
std::string RelativePath(std::string_view path) {
    if (path == "/") {
        return "index.html";
    }
    for (std::size_t i = 0; i < path.size(); ++i) {
        const bool nameBegins = path[i] == '/';
        if (nameBegins && (i + 1 == path.size() || path[i + 1] == '/' || path[i + 1] == '.')) {
            return {};
        }
    }
    return std::string(path.substr(std::min<std::size_t>(1, path.size())));
}

// Whether the name holds a digest of the content ("app-Ab3_d9-Z.js"), so that the file never
// changes.
bool HasDigestInName(std::string_view path, const FileKind& kind) {
    constexpr std::string_view kFolder = "assets/";
    constexpr std::size_t kDigestSize = 8;
    const std::string_view stem = path.substr(0, path.size() - kind.ending.size());
    if (stem.substr(0, kFolder.size()) != kFolder ||
        stem.size() < kFolder.size() + 1 + kDigestSize + 1) {
        return false;
    }
    const std::string_view digest = stem.substr(stem.size() - kDigestSize);
    return stem[stem.size() - kDigestSize - 1] == '-' &&
           std::all_of(digest.begin(), digest.end(), [](char c) {
               return (c >= '0' && c <= '9') || (c >= 'a' && c <= 'z') || (c >= 'A' && c <= 'Z') ||
                      c == '_' || c == '-';
           });
}

const char* CacheControlOf(std::string_view path, const FileKind& kind) {
    if (kind.ending == ".html") {
        return kNeverKept;
    }
    return HasDigestInName(path, kind) ? kImmutable : kRevalidated;
}

struct OpenFile {
    FileDescriptor fd;
    struct stat status {};
};

std::optional<OpenFile> OpenRegular(int folder, const std::string& path) {
    OpenFile file;
    file.fd = OpenBeneath(folder, path);
    if (!file.fd.IsOpen() || ::fstat(file.fd.Get(), &file.status) != 0 ||
        !S_ISREG(file.status.st_mode)) {
        return std::nullopt;
    }
    return file;
}

// Another one whenever the file was written or replaced. Digested, for a file's place on the disk
// is nobody's business.
std::string EntityTag(const struct stat& status) {
    constexpr std::size_t kTagDigits = 24;
    std::string identity;
    for (const auto part :
         {static_cast<long long>(status.st_dev), static_cast<long long>(status.st_ino),
          static_cast<long long>(status.st_size), static_cast<long long>(status.st_mtim.tv_sec),
          static_cast<long long>(status.st_mtim.tv_nsec),
          static_cast<long long>(status.st_ctim.tv_sec),
          static_cast<long long>(status.st_ctim.tv_nsec)}) {
        identity += std::to_string(part) + ' ';
    }
    return '"' + ToHex(Sha256(identity)).substr(0, kTagDigits) + '"';
}

// Calls `visit` with each element of a list "a, b;q=0.5" until it yields true; whether it did.
template <class Visit>
bool AnyElement(std::string_view list, Visit visit) {
    while (!list.empty()) {
        const std::size_t end = std::min(list.find(','), list.size());
        if (visit(TrimBlanks(list.substr(0, end)))) {
            return true;
        }
        list.remove_prefix(std::min(end + 1, list.size()));
    }
    return false;
}

bool TakesGzip(const HttpRequest& request) {
    return AnyElement(request.Header("Accept-Encoding").value_or(""), [](std::string_view element) {
        const std::size_t semicolon = std::min(element.find(';'), element.size());
        const std::string_view coding = TrimBlanks(element.substr(0, semicolon));
        const std::string_view rest =
            TrimBlanks(element.substr(std::min(semicolon + 1, element.size())));
        const std::string_view weight =
            TrimBlanks(rest.substr(std::min(rest.find('='), rest.size())));
        const bool refused =
            !weight.empty() && weight.find_first_of("123456789") == std::string_view::npos;
        return (EqualIgnoringCase(coding, "gzip") || coding == "*") && !refused;
    });
}

bool HasAlready(const HttpRequest& request, std::string_view tag) {
    return AnyElement(request.Header("If-None-Match").value_or(""), [tag](std::string_view known) {
        constexpr std::string_view kWeak = "W/";
        if (known.substr(0, kWeak.size()) == kWeak) {
            known.remove_prefix(kWeak.size());
        }
        return known == tag || known == "*";
    });
}

}  // namespace

std::optional<HttpResponse> PageFiles::Find(const HttpRequest& request) const {
    const std::string path = RelativePath(request.path);
    const FileKind* kind = FindKind(path);
    if (path.empty() || kind == nullptr) {
        return std::nullopt;
    }
    const FileDescriptor directory(::open(folder.c_str(), O_PATH | O_DIRECTORY | O_CLOEXEC));
    if (!directory.IsOpen()) {
        return std::nullopt;
    }
    std::optional<OpenFile> file = OpenRegular(directory.Get(), path);
    if (!file) {
        return std::nullopt;
    }
    HttpResponse response;
    response.headers = {{"Content-Type", kind->contentType},
                        {"Cache-Control", CacheControlOf(path, *kind)},
                        {"Content-Security-Policy", kContentSecurityPolicy},
                        {"X-Content-Type-Options", "nosniff"},
                        {"Referrer-Policy", "no-referrer"},
                        {"Cross-Origin-Opener-Policy", "same-origin"},
                        {"Cross-Origin-Resource-Policy", "same-origin"}};
    if (std::optional<OpenFile> compressed = OpenRegular(directory.Get(), path + ".gz")) {
        response.headers.emplace_back("Vary", "Accept-Encoding");
        if (TakesGzip(request)) {
            response.headers.emplace_back("Content-Encoding", "gzip");
            file = std::move(compressed);
        }
    }
    const std::string tag = EntityTag(file->status);
    response.headers.emplace_back("ETag", tag);
    if (HasAlready(request, tag)) {
        // Sent without its body, but with the length that it would have.
        response.status = 304;
    }
    response.file = std::move(file->fd);
    response.fileSize = static_cast<std::uint64_t>(file->status.st_size);
    return response;
}

}  // namespace orva

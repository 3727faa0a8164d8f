#include "appliance/scheduler/PrivateView.h"

#include <fcntl.h>
#include <linux/capability.h>
#include <sched.h>
#include <sys/prctl.h>
#include <sys/stat.h>
#include <sys/statvfs.h>
#include <sys/syscall.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cerrno>
#include <charconv>
#include <cstdlib>
#include <cstring>
#include <filesystem>
#include <string_view>
#include <vector>

#include "appliance/root/Root.h"
#include "appliance/supervisor/Spawn.h"
#include "appliance/util/FileDescriptor.h"

namespace orva {
namespace {

namespace fs = std::filesystem;

constexpr const char* kBubblewrap = "/usr/bin/bwrap";
constexpr const char* kTmp = "/tmp";
constexpr const char* kToolInTmp = "/tmp/orvaschedtool";
constexpr const char* kAppliance = "/usr/orva";
constexpr const char* kTool = "/usr/orva/bin/orvaschedtool";
constexpr const char* kToolName = "orvaschedtool";

// Says which process it is and keeps the view alive until its standard input ends.
constexpr const char* kHolder = "echo $$; read -r nothing";

std::string Because(const std::string& what) { return what + ": " + std::strerror(errno); }

bool IsBelow(const std::string& path, const std::string& folder) {
    return path.size() > folder.size() && path.compare(0, folder.size(), folder) == 0 &&
           path[folder.size()] == '/';
}

// The path without links; empty when there is nothing.
std::string RealPath(const std::string& path) {
    std::error_code error;
    return fs::canonical(path, error).string();
}

std::string OwnProgram() {
    std::error_code error;
    return fs::read_symlink("/proc/self/exe", error).string();
}

// The program that /tmp/orvaschedtool is to be: the root's, else, for a root without programs of
// its own, the one beside this program. Empty when there is neither.
std::string FindTool() {
    const std::string ofRoot = RealPath(ResolvePath(kTool));
    return ofRoot.empty() ? RealPath(fs::path(OwnProgram()).parent_path() / kToolName) : ofRoot;
}

bool IsMountPoint(const char* path) {
    struct statx status {};
    return ::statx(AT_FDCWD, path, AT_SYMLINK_NOFOLLOW, STATX_BASIC_STATS, &status) == 0 &&
           (status.stx_attributes & STATX_ATTR_MOUNT_ROOT) != 0;
}

// Whether what is at `program` stands unchangeably in a /tmp that nobody else has.
bool IsInPrivateView(const std::string& program) {
    struct stat tmp {};
    struct stat tool {};
    struct stat expected {};
    struct statvfs system {};
    if (::lstat(kTmp, &tmp) != 0 || ::lstat(kToolInTmp, &tool) != 0 ||
        ::stat(program.c_str(), &expected) != 0 || ::statvfs(kToolInTmp, &system) != 0) {
        return false;
    }
    return IsMountPoint(kTmp) && S_ISDIR(tmp.st_mode) && (tmp.st_mode & S_ISVTX) != 0 &&
           (tmp.st_uid == 0 || tmp.st_uid == ::geteuid()) && IsMountPoint(kToolInTmp) &&
           S_ISREG(tool.st_mode) && tool.st_dev == expected.st_dev &&
           tool.st_ino == expected.st_ino && (system.f_flag & ST_RDONLY) != 0;
}

// bubblewrap's command line.
class ViewArguments {
  public:
    void Add(std::initializer_list<std::string> more) {
        arguments.insert(arguments.end(), more.begin(), more.end());
    }

    // Everything in `folder` at its place, but for the names in `without`. What vanishes meanwhile
    // is left out.
    void AddEntries(const std::string& folder, std::initializer_list<std::string_view> without) {
        std::error_code error;
        for (fs::directory_iterator entry(folder, error), end; !error && entry != end;
             entry.increment(error)) {
            const std::string path = entry->path().string();
            const std::string name = entry->path().filename().string();
            bool wanted = true;
            for (const std::string_view other : without) {
                wanted = wanted && name != other;
            }
            std::error_code ignored;
            if (!wanted) {
                continue;
            }
            if (entry->is_symlink(ignored)) {
                Add({"--symlink", fs::read_symlink(entry->path(), ignored).string(), path});
            } else {
                Add({path == "/dev" ? "--dev-bind-try" : "--bind-try", path, path});
            }
        }
    }

    // A new folder that everybody may enter: those that bubblewrap makes by itself are for one
    // user.
    void AddFolder(const std::string& path) { Add({"--perms", "0755", "--dir", path}); }

    // Makes a folder of the machine's /tmp visible again at its place, when the root does not hold
    // it.
    void ShowInTmp(const std::string& bind, const std::string& folder) {
        if (!IsBelow(folder, kTmp) || IsBelow(folder, Root())) {
            return;
        }
        for (std::size_t at = std::strlen(kTmp); (at = folder.find('/', at + 1)) != folder.npos;) {
            AddFolder(folder.substr(0, at));
        }
        Add({bind, folder, folder});
    }

    std::vector<std::string> Take() { return std::move(arguments); }

  private:
    std::vector<std::string> arguments = {kBubblewrap, "--die-with-parent"};
};

std::vector<std::string> DescribeView(const std::string& tool) {
    ViewArguments view;
    view.AddEntries("/", {"tmp", "usr"});
    view.AddFolder("/usr");
    view.AddEntries("/usr", {"orva"});
    view.Add({"--bind-try", ResolvePath(kAppliance), kAppliance});
    view.Add({"--perms", "1777", "--tmpfs", kTmp});
    // The programs of a checkout may lie in /tmp themselves, and so may what a root is a link to.
    view.ShowInTmp("--ro-bind-try", fs::path(OwnProgram()).parent_path().parent_path().string());
    view.ShowInTmp("--ro-bind-try", fs::path(tool).parent_path().string());
    view.ShowInTmp("--bind-try", RealPath(Root()));
    view.ShowInTmp("--bind-try", Root());
    view.Add({"--ro-bind", tool, kToolInTmp});
    // Nothing must be written where it would vanish with the view.
    view.Add({"--remount-ro", "/", "--", "/bin/sh", "-c", kHolder});
    return view.Take();
}

struct Pipe {
    bool Open() {
        int ends[2];
        if (::pipe2(ends, O_CLOEXEC) != 0) {
            return false;
        }
        reading = FileDescriptor(ends[0]);
        writing = FileDescriptor(ends[1]);
        return true;
    }

    FileDescriptor reading;
    FileDescriptor writing;
};

std::string ReadLine(int file) {
    std::string line;
    char next = 0;
    while (line.size() < 1000) {
        const ssize_t got = ::read(file, &next, 1);
        if (got < 0 && errno == EINTR) {
            continue;
        }
        if (got <= 0 || next == '\n') {
            break;
        }
        line += next;
    }
    return line;
}

// The process that keeps the view alive until it has been joined.
class ViewHolder {
  public:
    ViewHolder() = default;
    ~ViewHolder() {
        hold.writing = FileDescriptor();
        if (bubblewrap > 0) {
            while (::waitpid(bubblewrap, nullptr, 0) < 0 && errno == EINTR) {
            }
        }
    }
    ViewHolder(const ViewHolder&) = delete;
    ViewHolder& operator=(const ViewHolder&) = delete;

    bool Start(const std::vector<std::string>& arguments, std::string& error) {
        Pipe answer;
        Pipe complaint;
        if (!hold.Open() || !answer.Open() || !complaint.Open()) {
            error = Because("pipe");
            return false;
        }
        SpawnActions actions;
        ::posix_spawn_file_actions_adddup2(actions.Get(), hold.reading.Get(), STDIN_FILENO);
        ::posix_spawn_file_actions_adddup2(actions.Get(), answer.writing.Get(), STDOUT_FILENO);
        ::posix_spawn_file_actions_adddup2(actions.Get(), complaint.writing.Get(), STDERR_FILENO);
        const SpawnAttributes attributes;
        const int failed = ::posix_spawn(&bubblewrap, kBubblewrap, actions.Get(), attributes.Get(),
                                         SpawnTexts(arguments).data(), environ);
        if (failed != 0) {
            bubblewrap = -1;
            error = std::string(kBubblewrap) + ": " + std::strerror(failed) +
                    (failed == ENOENT ? " (the package bubblewrap is not installed)" : "");
            return false;
        }
        answer.writing = FileDescriptor();
        complaint.writing = FileDescriptor();
        const std::string line = ReadLine(answer.reading.Get());
        const auto [stop, problem] =
            std::from_chars(line.data(), line.data() + line.size(), holder);
        if (problem != std::errc() || holder <= 0) {
            error = ReadLine(complaint.reading.Get());
            error = error.empty() ? "bubblewrap made none" : error;
            return false;
        }
        return true;
    }

    FileDescriptor OpenNamespace(const char* kind) const {
        const std::string path = "/proc/" + std::to_string(holder) + "/ns/" + kind;
        return FileDescriptor(::open(path.c_str(), O_RDONLY | O_CLOEXEC));
    }

  private:
    Pipe hold;
    pid_t bubblewrap = -1;
    pid_t holder = 0;
};

bool IsOwnNamespace(int other, const char* own) {
    struct stat theirs {};
    struct stat ours {};
    return ::fstat(other, &theirs) == 0 && ::stat(own, &ours) == 0 &&
           theirs.st_dev == ours.st_dev && theirs.st_ino == ours.st_ino;
}

// Who joins a user namespace has all rights in it until the next program is started.
bool DropCapabilities() {
    __user_cap_header_struct header{_LINUX_CAPABILITY_VERSION_3, 0};
    __user_cap_data_struct none[_LINUX_CAPABILITY_U32S_3] = {};
    // Joining has also taken /proc/self away from the process, like a set-user-id program.
    return ::syscall(SYS_capset, &header, none) == 0 && ::prctl(PR_SET_DUMPABLE, 1) == 0;
}

bool Join(const ViewHolder& holder, std::string& error) {
    const FileDescriptor users = holder.OpenNamespace("user");
    const FileDescriptor mounts = holder.OpenNamespace("mnt");
    if (!users.IsOpen() || !mounts.IsOpen()) {
        error = Because("its namespaces");
        return false;
    }
    std::error_code ignored;
    const std::string directory = fs::current_path(ignored).string();
    const bool otherUsers = !IsOwnNamespace(users.Get(), "/proc/self/ns/user");
    if ((otherUsers && ::setns(users.Get(), CLONE_NEWUSER) != 0) ||
        ::setns(mounts.Get(), CLONE_NEWNS) != 0 || (otherUsers && !DropCapabilities())) {
        error = Because("cannot be joined");
        return false;
    }
    // It has become the view's top.
    if (directory.empty() || ::chdir(directory.c_str()) != 0) {
        return ::chdir("/") == 0;
    }
    return true;
}

}  // namespace

bool EnterPrivateView(std::string& error) {
    constexpr const char* kNoView = "cannot make a private view of the file system: ";
    if (RealPath(Root()) == kTmp || Root() == kTmp) {
        error = std::string(kNoView) + "the root must not be /tmp itself";
        return false;
    }
    const std::string tool = FindTool();
    if (tool.empty()) {
        error = kNoView + Because(ResolvePath(kTool));
        return false;
    }
    if (IsInPrivateView(tool)) {
        return true;
    }
    ViewHolder holder;
    std::string reason;
    if (!holder.Start(DescribeView(tool), reason) || !Join(holder, reason)) {
        error = kNoView + reason;
        return false;
    }
    if (!IsInPrivateView(tool)) {
        error = std::string(kNoView) + kToolInTmp + " is not the appliance's program in it";
        return false;
    }
    return true;
}

}  // namespace orva

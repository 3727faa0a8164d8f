#include "appliance/store/Database.h"

#include <sys/file.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <exception>
#include <thread>
#include <utility>

#include "appliance/store/DatabaseFile.h"
#include "appliance/store/Schema.h"
#include "appliance/store/StoreFailure.h"

namespace orva {
namespace {

// Enough for readers to run beside the one writer; each costs file descriptors and a page cache.
constexpr std::size_t kMostConnections = 4;
constexpr std::chrono::microseconds kNextWriterRetry{500};

}  // namespace

Database::Database(std::string databaseFile, std::chrono::milliseconds busyTimeoutToUse)
    : file(std::move(databaseFile)), busyTimeout(busyTimeoutToUse) {}

Database::~Database() = default;

Database::FileId Database::Identify(const std::string& path) {
    struct stat status {};
    if (::stat(path.c_str(), &status) != 0) {
        return {};
    }
    return {status.st_dev, status.st_ino};
}

std::uint64_t Database::Generation() {
    const std::lock_guard lock(mutex);
    CheckFile();
    return generation;
}

std::optional<uid_t> Database::FolderOwner() {
    const std::lock_guard lock(mutex);
    return folderOwner;
}

std::unique_ptr<Connection> Database::Open() {
    const std::lock_guard lock(mutex);
    CheckFile();
    return OpenLocked();
}

void Database::CheckFile() {
    if (openFile != FileId() && Identify(file) != openFile) {
        ForgetFile();
    }
}

// SQLite leaves the log of a file that was moved away where it is, and would take it for the log of
// the file that stands there now.
void Database::ForgetFile() {
    idle.clear();
    ++generation;
    openFile = {};
    directory = nullptr;
    folderOwner = std::nullopt;
    const FileId formerLog = std::exchange(openLog, {});
    const std::string log = file + "-wal";
    if (formerLog == FileId() || Identify(log) != formerLog) {
        return;
    }
    const FileDescriptor lock = LockDatabaseDirectory(file, busyTimeout);
    if (Identify(log) == formerLog) {
        ::unlink(log.c_str());
        ::unlink((file + "-shm").c_str());
    }
}

std::unique_ptr<Connection> Database::OpenLocked() {
    if (Identify(file) == FileId()) {
        CreateDatabaseDirectory(file);
        CreateDatabaseFile(file);
    }
    CheckDatabaseFile(file);
    const FileId identity = Identify(file);
    auto connection = std::make_unique<Connection>(file, busyTimeout);
    if (openFile == FileId()) {
        Prepare(*connection);
        directory = std::make_shared<const FileDescriptor>(OpenDatabaseDirectory(file));
        struct stat status {};
        if (::fstat(directory->Get(), &status) == 0) {
            folderOwner = status.st_uid;
        }
        openFile = identity;
        openLog = Identify(file + "-wal");
    }
    return connection;
}

void Database::Prepare(Connection& connection) {
    if (!IsSchemaCurrent(connection) || !connection.HasWriteAheadLog()) {
        // Two processes that switch on the log at once would find each other's lock, which SQLite
        // does not wait for there.
        const FileDescriptor lock = LockDatabaseDirectory(file, busyTimeout);
        connection.UseWriteAheadLog();
        MigrateSchema(connection);
    }
    // Opens the log, whose identity is wanted.
    static_cast<void>(IsSchemaCurrent(connection));
}

Database::Lease::Lease(Database& owner)
    : database(owner), generation(0), exceptions(std::uncaught_exceptions()) {
    std::unique_lock lock(database.mutex);
    if (!database.connectionGivenBack.wait_for(
            lock, database.busyTimeout, [this] { return database.borrowed < kMostConnections; })) {
        throw StoreFailure(kErrDatabaseBusy, "all connections are in use");
    }
    database.CheckFile();
    generation = database.generation;
    if (database.idle.empty()) {
        connection = database.OpenLocked();
    } else {
        connection = std::move(database.idle.back());
        database.idle.pop_back();
    }
    ++database.borrowed;
}

Database::Lease::~Lease() {
    const bool failed = std::uncaught_exceptions() > exceptions;
    {
        const std::lock_guard lock(database.mutex);
        --database.borrowed;
        if (!failed && generation == database.generation) {
            database.idle.push_back(std::move(connection));
        }
    }
    database.connectionGivenBack.notify_one();
}

Database::WriteTurn::WriteTurn(Database& owner) : database(owner) {
    std::unique_lock lock(database.turnMutex);
    if (!database.turnGivenBack.wait_for(lock, database.busyTimeout,
                                         [this] { return !database.turnTaken; })) {
        throw StoreFailure(kErrDatabaseBusy, "other changes take too long");
    }
    database.turnTaken = true;
}

Database::WriteTurn::~WriteTurn() {
    {
        const std::lock_guard lock(database.turnMutex);
        database.turnTaken = false;
    }
    database.turnGivenBack.notify_one();
}

Database::NextWriter::NextWriter(Database& owner) {
    {
        const std::lock_guard lock(owner.mutex);
        directory = owner.directory;
    }
    const auto deadline = std::chrono::steady_clock::now() + owner.busyTimeout;
    while (directory != nullptr && ::flock(directory->Get(), LOCK_EX | LOCK_NB) != 0) {
        if (errno != EWOULDBLOCK && errno != EINTR) {
            directory = nullptr;
        } else if (std::chrono::steady_clock::now() >= deadline) {
            directory = nullptr;
            throw StoreFailure(kErrDatabaseBusy, "changes by other processes take too long");
        } else {
            std::this_thread::sleep_for(kNextWriterRetry);
        }
    }
}

void Database::NextWriter::Yield() {
    if (directory != nullptr) {
        ::flock(directory->Get(), LOCK_UN);
        directory = nullptr;
    }
}

}  // namespace orva

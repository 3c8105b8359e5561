#include "host/daemon/Database.h"

#include <cerrno>
#include <sqlite3.h>
#include <utility>

namespace marrowdale::host {

namespace {

int errnoOf(int result) {
    switch (result & 0xFF) {
        case SQLITE_FULL:
            return ENOSPC;
        case SQLITE_CORRUPT:
        case SQLITE_NOTADB:
            return EUCLEAN;
        case SQLITE_BUSY:
            return EBUSY;
        case SQLITE_READONLY:
            return EROFS;
        default:
            return EIO;
    }
}

Unexpected failed(sqlite3* connection, int result) {
    return Unexpected(
        errorWithPOSIXCode(errnoOf(result), "use the search index", ::sqlite3_errmsg(connection)));
}

}  // namespace

Statement::~Statement() {
    ::sqlite3_finalize(statement_);
}

Statement::Statement(Statement&& other) noexcept
    : statement_(std::exchange(other.statement_, nullptr)) {}

Statement& Statement::bind(int position, std::string_view text) {
    ::sqlite3_bind_text64(statement_, position, text.data(), text.size(), SQLITE_TRANSIENT,
                          SQLITE_UTF8);
    return *this;
}

Statement& Statement::bind(int position, std::int64_t number) {
    ::sqlite3_bind_int64(statement_, position, number);
    return *this;
}

Statement& Statement::bindNull(int position) {
    ::sqlite3_bind_null(statement_, position);
    return *this;
}

Expected<bool> Statement::step() {
    const int result = ::sqlite3_step(statement_);
    if (result == SQLITE_ROW) {
        return true;
    }
    ::sqlite3_reset(statement_);
    if (result == SQLITE_DONE) {
        return false;
    }
    return failed(::sqlite3_db_handle(statement_), result);
}

Expected<void> Statement::run() {
    while (true) {
        const auto hasRow = step();
        if (!hasRow) {
            return Unexpected(hasRow.error());
        }
        if (!*hasRow) {
            return {};
        }
    }
}

std::string_view Statement::text(int column) const {
    const auto* const text = ::sqlite3_column_text(statement_, column);
    const int size = ::sqlite3_column_bytes(statement_, column);
    return text == nullptr ? std::string_view()
                           : std::string_view(reinterpret_cast<const char*>(text),
                                              static_cast<std::size_t>(size));
}

std::int64_t Statement::number(int column) const {
    return ::sqlite3_column_int64(statement_, column);
}

void Database::Close::operator()(sqlite3* connection) const {
    ::sqlite3_close(connection);
}

Expected<Database> Database::open(const std::string& path) {
    sqlite3* opened = nullptr;
    const int result = ::sqlite3_open_v2(
        path.c_str(), &opened, SQLITE_OPEN_READWRITE | SQLITE_OPEN_CREATE | SQLITE_OPEN_NOMUTEX,
        nullptr);
    Database database{std::unique_ptr<sqlite3, Close>(opened)};
    if (result != SQLITE_OK) {
        return failed(opened, result);
    }
    // Exclusive before the log's mode is chosen: then there is no shared-memory file to lose.
    if (auto prepared = database.run("PRAGMA locking_mode=EXCLUSIVE; PRAGMA journal_mode=WAL; "
                                     "PRAGMA synchronous=OFF; PRAGMA cache_size=-2000;");
        !prepared) {
        return Unexpected(prepared.error());
    }
    return database;
}

Expected<void> Database::run(const std::string& statements) {
    const int result =
        ::sqlite3_exec(connection_.get(), statements.c_str(), nullptr, nullptr, nullptr);
    if (result != SQLITE_OK) {
        return failed(connection_.get(), result);
    }
    return {};
}

Expected<Statement> Database::prepare(std::string_view text) {
    sqlite3_stmt* statement = nullptr;
    const int result =
        ::sqlite3_prepare_v3(connection_.get(), text.data(), static_cast<int>(text.size()),
                             SQLITE_PREPARE_PERSISTENT, &statement, nullptr);
    if (result != SQLITE_OK) {
        return failed(connection_.get(), result);
    }
    return Statement(statement);
}

}  // namespace marrowdale::host

#pragma once

#include <cstdint>
#include <memory>
#include <string>
#include <string_view>

#include "platform/foundation/Error.h"

struct sqlite3;
struct sqlite3_stmt;

namespace marrowdale::host {

// A statement that is run any number of times. Values are bound by position from 1, columns are
// read by position from 0. Texts are bytes. One thread at a time.
class Statement {
  public:
    explicit Statement(sqlite3_stmt* statement) : statement_(statement) {}
    ~Statement();
    Statement(Statement&& other) noexcept;
    Statement& operator=(Statement&&) = delete;
    Statement(const Statement&) = delete;
    Statement& operator=(const Statement&) = delete;

    Statement& bind(int position, std::string_view text);
    Statement& bind(int position, std::int64_t number);
    Statement& bindNull(int position);

    // The next row; false at the end, where the statement is ready to be run again.
    [[nodiscard]] Expected<bool> step();
    // Runs it to its end.
    [[nodiscard]] Expected<void> run();

    // Good until the next step.
    [[nodiscard]] std::string_view text(int column) const;
    [[nodiscard]] std::int64_t number(int column) const;

  private:
    sqlite3_stmt* statement_;
};

// A database in one file that one process has to itself (an exclusive lock and a write-ahead log
// without shared memory), for what can be made again: nothing waits for the disk. Errors are EIO
// and EUCLEAN with the library's text, ENOSPC for a full disk. One thread at a time.
class Database {
  public:
    // Opens or makes the file, and sees that it can be read and written.
    [[nodiscard]] static Expected<Database> open(const std::string& path);

    // Runs statements without values.
    [[nodiscard]] Expected<void> run(const std::string& statements);
    [[nodiscard]] Expected<Statement> prepare(std::string_view text);

  private:
    struct Close {
        void operator()(sqlite3* connection) const;
    };
    explicit Database(std::unique_ptr<sqlite3, Close> connection)
        : connection_(std::move(connection)) {}
    std::unique_ptr<sqlite3, Close> connection_;
};

}  // namespace marrowdale::host

/// A connection to SQLite and its prepared statements, closed with their owner; failures become the store's exceptions.
///
/// One thread at a time for a connection and its statements. A statement does not outlive its connection.
#ifndef SENSOR_STORE_SRC_DATABASE_H
#define SENSOR_STORE_SRC_DATABASE_H

#include <sqlite3.h>

#include <concepts>
#include <cstdint>
#include <functional>
#include <memory>
#include <optional>
#include <span>
#include <string>
#include <string_view>

#include "sensor/client/include/FcName.h"
#include "sensor/store/include/StoreErrors.h"

/// Whether a connection may write.
enum ZTEDatabaseAccess { ZTDA_ReadWrite, ZTDA_ReadOnly };

class ZTCDatabase {
public:
    ZTCDatabase() = default;
    /// The file exists. A reader that finds it locked waits for up to a second, a writer for five.
    ZTCDatabase(const std::string& acrPath, ZTEDatabaseAccess aAccess);

    bool isOpen() const { return mpHandle != nullptr; }
    sqlite3* handle() const { return mpHandle.get(); }
    const std::string& getPath() const { return mPath; }

    /// Runs statements that yield no rows.
    void execute(const char* apSql);
    /// Rolls a transaction back, where there is one. Never throws.
    void rollBack() noexcept;
    /// Calls it in one transaction: all that it reads belongs together, whatever is written meanwhile.
    void readAsOne(const std::function<void()>& acrRead);
    /// The first column of the first row; 0 where there is no row.
    std::int64_t readNumber(const char* apSql);
    int countChangedRows() const { return sqlite3_changes(mpHandle.get()); }

    /// Throws what stands for the result code, with the purpose and SQLite's reason.
    [[noreturn]] static void fail(sqlite3* apHandle, int aResult, const std::string& acrPath, std::string_view aWhat);

private:
    struct Close {
        void operator()(sqlite3* apHandle) const { sqlite3_close_v2(apHandle); }
    };
    std::string mPath;
    std::unique_ptr<sqlite3, Close> mpHandle;
};

class ZTCStatement {
public:
    ZTCStatement() = default;
    /// Kept for many runs.
    ZTCStatement(ZTCDatabase& arDatabase, std::string_view aSql);

    /// Runs it to its end with these values. The values need to live as long as the call.
    template <typename... T>
    void run(const T&... acrValues) {
        bindAll(acrValues...);
        while (step()) {
        }
    }
    /// Starts a query with these values; then call step() until it returns false, or reset(). The values need to live
    /// until then.
    template <typename... T>
    ZTCStatement& query(const T&... acrValues) {
        bindAll(acrValues...);
        return *this;
    }

    /// The next row. False: there is none, and the statement is reset.
    bool step();
    void reset() noexcept { sqlite3_reset(mpHandle.get()); }

    bool isNull(int aColumn) const { return sqlite3_column_type(mpHandle.get(), aColumn) == SQLITE_NULL; }
    std::int64_t number(int aColumn) const { return sqlite3_column_int64(mpHandle.get(), aColumn); }
    template <std::integral T>
    T number(int aColumn) const {
        return static_cast<T>(number(aColumn));
    }
    std::string text(int aColumn) const;
    /// Lives until the next step.
    std::span<const std::uint8_t> blob(int aColumn) const;
    /// Absent where the column is null or holds no eight bytes.
    std::optional<ZTSFcName> name(int aColumn) const;

    // Values one by one, for queries that are put together at run time. Numbers of places start at 1.
    void bind(int aPlace, std::nullptr_t);
    void bind(int aPlace, std::string_view aText);
    void bind(int aPlace, std::span<const std::uint8_t> aBytes);
    void bind(int aPlace, const ZTSFcName& acrName) { bind(aPlace, std::span(acrName.mBytes)); }
    template <std::integral T>
    void bind(int aPlace, T aNumber) {
        bindNumber(aPlace, static_cast<std::int64_t>(aNumber));
    }
    template <typename T>
    void bind(int aPlace, const std::optional<T>& acrValue) {
        if (acrValue) {
            bind(aPlace, *acrValue);
        } else {
            bind(aPlace, nullptr);
        }
    }

private:
    struct Finalize {
        void operator()(sqlite3_stmt* apHandle) const { sqlite3_finalize(apHandle); }
    };
    template <typename... T>
    void bindAll(const T&... acrValues) {
        reset();
        int lPlace = 0;
        (bind(++lPlace, acrValues), ...);
    }
    void bindNumber(int aPlace, std::int64_t aNumber);
    void check(int aResult) const;

    ZTCDatabase* mpDatabase = nullptr;
    std::unique_ptr<sqlite3_stmt, Finalize> mpHandle;
};

#endif

#include "sensor/store/src/Database.h"

#include <cerrno>
#include <cstring>
#include <new>

ZTCDatabase::ZTCDatabase(const std::string& acrPath, ZTEDatabaseAccess aAccess) : mPath(acrPath) {
    const int lFlags = (aAccess == ZTDA_ReadWrite ? SQLITE_OPEN_READWRITE : SQLITE_OPEN_READONLY) |
                       SQLITE_OPEN_NOMUTEX | SQLITE_OPEN_EXRESCODE;
    sqlite3* lpHandle = nullptr;
    const int lResult = sqlite3_open_v2(acrPath.c_str(), &lpHandle, lFlags, nullptr);
    mpHandle.reset(lpHandle);
    if (lResult != SQLITE_OK) {
        fail(lpHandle, lResult, acrPath, "it cannot be opened");
    }
    sqlite3_busy_timeout(lpHandle, aAccess == ZTDA_ReadWrite ? 5000 : 1000);
}

void ZTCDatabase::execute(const char* apSql) {
    const int lResult = sqlite3_exec(mpHandle.get(), apSql, nullptr, nullptr, nullptr);
    if (lResult != SQLITE_OK) {
        fail(mpHandle.get(), lResult, mPath, apSql);
    }
}

void ZTCDatabase::rollBack() noexcept {
    if (mpHandle != nullptr && sqlite3_get_autocommit(mpHandle.get()) == 0) {
        sqlite3_exec(mpHandle.get(), "ROLLBACK", nullptr, nullptr, nullptr);
    }
}

void ZTCDatabase::readAsOne(const std::function<void()>& acrRead) {
    execute("BEGIN");
    try {
        acrRead();
        execute("COMMIT");
    } catch (...) {
        rollBack();
        throw;
    }
}

std::int64_t ZTCDatabase::readNumber(const char* apSql) {
    ZTCStatement lStatement(*this, apSql);
    return lStatement.query().step() ? lStatement.number(0) : 0;
}

void ZTCDatabase::fail(sqlite3* apHandle, int aResult, const std::string& acrPath, std::string_view aWhat) {
    const std::string lReason = sqlite3_errstr(aResult);
    std::string lText = acrPath + ": " + std::string(aWhat.substr(0, 200)) + ": " + lReason;
    std::string lDetail;
    if (apHandle != nullptr) {
        lDetail = lReason == sqlite3_errmsg(apHandle) ? "" : sqlite3_errmsg(apHandle);
        const int lErrno = sqlite3_system_errno(apHandle);
        const int lKind = aResult & 0xFF;
        if (lErrno != 0 && (lKind == SQLITE_IOERR || lKind == SQLITE_FULL || lKind == SQLITE_CANTOPEN)) {
            lDetail += (lDetail.empty() ? "" : "; ") + std::string(std::strerror(lErrno));
        }
    }
    lText += lDetail.empty() ? "" : " (" + lDetail + ")";
    switch (aResult & 0xFF) {
        case SQLITE_NOMEM:
            throw std::bad_alloc();
        case SQLITE_CORRUPT:
        case SQLITE_NOTADB:
            throw ZTCStoreDamagedEx(lText);
        case SQLITE_FULL:
        case SQLITE_READONLY:
        case SQLITE_IOERR:
        case SQLITE_CANTOPEN:
        case SQLITE_PERM:
            throw ZTCStoreNoRoomEx(lText);
        default:
            throw ZTCStoreEx(lText);
    }
}

ZTCStatement::ZTCStatement(ZTCDatabase& arDatabase, std::string_view aSql) : mpDatabase(&arDatabase) {
    sqlite3_stmt* lpHandle = nullptr;
    const int lResult = sqlite3_prepare_v3(arDatabase.handle(), aSql.data(), static_cast<int>(aSql.size()),
                                           SQLITE_PREPARE_PERSISTENT, &lpHandle, nullptr);
    mpHandle.reset(lpHandle);
    if (lResult != SQLITE_OK) {
        ZTCDatabase::fail(arDatabase.handle(), lResult, arDatabase.getPath(), aSql);
    }
}

bool ZTCStatement::step() {
    const int lResult = sqlite3_step(mpHandle.get());
    if (lResult == SQLITE_ROW) {
        return true;
    }
    if (lResult != SQLITE_DONE) {
        try {
            ZTCDatabase::fail(mpDatabase->handle(), lResult, mpDatabase->getPath(), sqlite3_sql(mpHandle.get()));
        } catch (...) {
            reset();
            throw;
        }
    }
    reset();
    return false;
}

std::string ZTCStatement::text(int aColumn) const {
    const auto* const lpText = reinterpret_cast<const char*>(sqlite3_column_text(mpHandle.get(), aColumn));
    const int lSize = sqlite3_column_bytes(mpHandle.get(), aColumn);
    return lpText == nullptr ? std::string() : std::string(lpText, static_cast<std::size_t>(lSize));
}

std::span<const std::uint8_t> ZTCStatement::blob(int aColumn) const {
    const auto* const lpBytes = static_cast<const std::uint8_t*>(sqlite3_column_blob(mpHandle.get(), aColumn));
    const int lSize = sqlite3_column_bytes(mpHandle.get(), aColumn);
    return {lpBytes, lpBytes == nullptr ? 0 : static_cast<std::size_t>(lSize)};
}

std::optional<ZTSFcName> ZTCStatement::name(int aColumn) const {
    const std::span<const std::uint8_t> lBytes = blob(aColumn);
    ZTSFcName lName;
    if (lBytes.size() != lName.mBytes.size()) {
        return std::nullopt;
    }
    std::memcpy(lName.mBytes.data(), lBytes.data(), lBytes.size());
    return lName;
}

void ZTCStatement::bind(int aPlace, std::nullptr_t) {
    check(sqlite3_bind_null(mpHandle.get(), aPlace));
}

void ZTCStatement::bind(int aPlace, std::string_view aText) {
    check(sqlite3_bind_text64(mpHandle.get(), aPlace, aText.data() == nullptr ? "" : aText.data(), aText.size(),
                              SQLITE_STATIC, SQLITE_UTF8));
}

void ZTCStatement::bind(int aPlace, std::span<const std::uint8_t> aBytes) {
    static constexpr std::uint8_t scNothing = 0;
    check(sqlite3_bind_blob64(mpHandle.get(), aPlace, aBytes.empty() ? &scNothing : aBytes.data(), aBytes.size(),
                              SQLITE_STATIC));
}

void ZTCStatement::bindNumber(int aPlace, std::int64_t aNumber) {
    check(sqlite3_bind_int64(mpHandle.get(), aPlace, aNumber));
}

void ZTCStatement::check(int aResult) const {
    if (aResult != SQLITE_OK) {
        ZTCDatabase::fail(mpDatabase->handle(), aResult, mpDatabase->getPath(), sqlite3_sql(mpHandle.get()));
    }
}

/// What the store and the history throw. Every text is one line that names the file, what was wanted and the reason.
#ifndef SENSOR_STORE_INCLUDE_STOREERRORS_H
#define SENSOR_STORE_INCLUDE_STOREERRORS_H

#include <stdexcept>

/// Base of the family. Thrown itself for an unexpected failure of the database.
class ZTCStoreEx : public std::runtime_error {
public:
    using std::runtime_error::runtime_error;
};

/// Nothing can be written now: the disk is full, over quota or read-only, or fails to write. The transaction is rolled
/// back and nothing of it is stored. The store stays usable: the same work succeeds once there is room.
class ZTCStoreNoRoomEx : public ZTCStoreEx {
public:
    using ZTCStoreEx::ZTCStoreEx;
};

/// The database is damaged. The transaction is rolled back. ZTCStore::reopen() sets the file aside and begins a new
/// one.
class ZTCStoreDamagedEx : public ZTCStoreEx {
public:
    using ZTCStoreEx::ZTCStoreEx;
};

/// The schema was written by a newer version of this program. The file is left as it is.
class ZTCStoreNewerEx : public ZTCStoreEx {
public:
    using ZTCStoreEx::ZTCStoreEx;
};

/// For readers only: there is no database yet, or one that the sensor has not finished creating or migrating.
class ZTCNoHistoryEx : public ZTCStoreEx {
public:
    using ZTCStoreEx::ZTCStoreEx;
};

#endif

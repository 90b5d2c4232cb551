#include "sensor/store/include/DamagedHistories.h"

#include <gmock/gmock.h>

#include "sensor/store/src/StoreFile.h"
#include "tests/support/TemporaryDirectory.h"

using testing::ElementsAre;
using testing::IsEmpty;
using testing::Optional;

TEST(DamagedHistories, AreListedByTheirDatesAndNothingElseIs) {
    const ZTCTemporaryDirectory lDirectory;
    for (const char* lpName :
         {"history.db", "history.db-wal", "history.damaged-20270101-000000.db", "history.damaged-20261121-100412.db",
          "history.damaged-20261121-100412.db-wal", "history.damaged-notes.txt", "old-history.damaged-1.db"}) {
        writeFile(lDirectory.path(lpName), "");
    }
    EXPECT_THAT(listDamagedHistories(lDirectory.path()),
                Optional(ElementsAre(lDirectory.path("history.damaged-20261121-100412.db"),
                                     lDirectory.path("history.damaged-20270101-000000.db"))));
}

TEST(DamagedHistories, ADatabaseThatIsSetAsideIsAmongThem) {
    const ZTCTemporaryDirectory lDirectory;
    writeFile(lDirectory.path("history.db"), "one");
    const std::string lFirst = setDamagedFileAside(lDirectory.path("history.db"));
    EXPECT_THAT(listDamagedHistories(lDirectory.path()), Optional(ElementsAre(lFirst)));
    writeFile(lDirectory.path("history.db"), "other");
    const std::string lSecond = setDamagedFileAside(lDirectory.path("history.db"));
    EXPECT_THAT(listDamagedHistories(lDirectory.path()), Optional(testing::UnorderedElementsAre(lFirst, lSecond)));
}

TEST(DamagedHistories, AreNotKnownWhereTheDirectoryCannotBeReadAndNoneWhereItIsMissing) {
    const ZTCTemporaryDirectory lDirectory;
    writeFile(lDirectory.path("file"), "");
    EXPECT_EQ(listDamagedHistories(lDirectory.path("file")), std::nullopt);
    EXPECT_THAT(listDamagedHistories(lDirectory.path("missing")), Optional(IsEmpty()));
}

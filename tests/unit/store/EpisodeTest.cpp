// Runs of like events become episodes: gaps, counts, times, phases, unions.
#include "sensor/store/include/Episode.h"

#include "sensor/store/src/Database.h"
#include "tests/unit/store/StoreFixture.h"

using EpisodeTest = ZTCStoreTest;

TEST_F(EpisodeTest, LikeRecordsWithinTheGapAreOneEpisodeWithAnExactCount) {
    take({makeQueueFull(gcPortA, gcBase, gcBase + 2 * gcSecond, 7, 3)});
    take({makeQueueFull(gcPortA, gcBase + 10 * gcSecond, gcBase + 11 * gcSecond, 5, 40)});
    const auto lEpisodes = episodes();
    ASSERT_EQ(lEpisodes.size(), 1U);
    const ZTSEpisode& lrEpisode = lEpisodes[0];
    EXPECT_EQ(lrEpisode.mKind, gcQueueFull);
    EXPECT_EQ(lrEpisode.mCount, 12U);
    EXPECT_EQ(lrEpisode.mRecords, 2U);
    EXPECT_EQ(toMicroseconds(lrEpisode.mFirst), gcBase);
    EXPECT_EQ(toMicroseconds(lrEpisode.mLast), gcBase + 11 * gcSecond);
    EXPECT_EQ(lrEpisode.mInitiator.mWwpn, makeName(gcLocalPort));
    EXPECT_EQ(lrEpisode.mInitiator.mWwnn, makeName(gcLocalNode));
    ASSERT_TRUE(lrEpisode.mRemotePort.has_value());
    EXPECT_EQ(lrEpisode.mRemotePort->mWwpn, makeName(gcPortA));
    EXPECT_EQ(lrEpisode.mRemotePort->mWwnn, std::nullopt);
    EXPECT_EQ(lrEpisode.mRemotePort->mFcId, std::nullopt);
    ASSERT_TRUE(lrEpisode.mDetail.mLuns.has_value());
    EXPECT_EQ(lrEpisode.mDetail.mLuns->mNumbers, (std::vector<std::uint32_t>{3, 40}));
    EXPECT_FALSE(lrEpisode.mDetail.mLuns->mIsAll);
    EXPECT_EQ(lrEpisode.mPhase, ZTP_Open);
    EXPECT_FALSE(lrEpisode.mHasClockFlag);
    EXPECT_FALSE(lrEpisode.mIsMalformed);
}

TEST_F(EpisodeTest, AGapOfExactlyTheLimitGoesOnAndOneMicrosecondMoreBeginsAnother) {
    take({makeQueueFull(gcPortA, gcBase, gcBase + gcSecond)});
    take({makeQueueFull(gcPortA, gcBase + 61 * gcSecond, gcBase + 62 * gcSecond)});
    ASSERT_EQ(episodes().size(), 1U);
    take({makeQueueFull(gcPortA, gcBase + 122 * gcSecond + 1, gcBase + 122 * gcSecond + 1)});
    const auto lEpisodes = episodes();
    ASSERT_EQ(lEpisodes.size(), 2U);
    EXPECT_EQ(lEpisodes[0].mPhase, ZTP_Closed);
    EXPECT_EQ(lEpisodes[0].mCount, 2U);
    EXPECT_EQ(lEpisodes[1].mPhase, ZTP_Open);
    EXPECT_EQ(lEpisodes[1].mCount, 1U);
    EXPECT_LT(lEpisodes[0].mEpisode, lEpisodes[1].mEpisode);
}

TEST_F(EpisodeTest, ARecordIsOneRunWhateverGapsItHides) {
    take({makeQueueFull(gcPortA, gcBase, gcBase + 3600 * gcSecond, 2)});
    take({makeQueueFull(gcPortA, gcBase + 3660 * gcSecond, gcBase + 3660 * gcSecond)});
    ASSERT_EQ(episodes().size(), 1U);
    EXPECT_EQ(episodes()[0].mCount, 3U);
}

TEST_F(EpisodeTest, ARecordThatBeginsBeforeTheLastHasNoGap) {
    take({makeQueueFull(gcPortA, gcBase + 1000 * gcSecond, gcBase + 1001 * gcSecond)});
    take({makeQueueFull(gcPortA, gcBase, gcBase + gcSecond)});
    const auto lEpisodes = episodes();
    ASSERT_EQ(lEpisodes.size(), 1U);
    EXPECT_EQ(toMicroseconds(lEpisodes[0].mFirst), gcBase);
    EXPECT_EQ(toMicroseconds(lEpisodes[0].mLast), gcBase + 1001 * gcSecond);
}

TEST_F(EpisodeTest, EventsThatTakeTurnsStayInTheirOwnEpisodes) {
    std::vector<ZTSTestRecord> lRecords;
    for (int i = 0; i < 100; ++i) {
        lRecords.push_back(makeQueueFull(i % 2 == 0 ? gcPortA : gcPortB, gcBase + i, gcBase + i));
    }
    take(lRecords);
    const auto lEpisodes = episodes();
    ASSERT_EQ(lEpisodes.size(), 2U);
    EXPECT_EQ(lEpisodes[0].mCount, 50U);
    EXPECT_EQ(lEpisodes[1].mCount, 50U);
}

TEST_F(EpisodeTest, AnotherInitiatorHasEpisodesOfItsOwn) {
    take({makeQueueFull(gcPortA, gcBase, gcBase)});
    take({makeQueueFull(gcPortA, gcBase, gcBase)}, gcBase, gcOtherLocalPort);
    EXPECT_EQ(episodes().size(), 2U);
}

TEST_F(EpisodeTest, ItClosesWithTheFirstLookLaterThanItsLastEventAndTheGap) {
    take({makeQueueFull(gcPortA, gcBase, gcBase + gcSecond)});
    EXPECT_EQ(closeAt(gcBase + 61 * gcSecond), 0U);
    EXPECT_EQ(episodes()[0].mPhase, ZTP_Open);
    EXPECT_EQ(closeAt(gcBase + 61 * gcSecond + 1), 1U);
    EXPECT_EQ(episodes()[0].mPhase, ZTP_Closed);
    EXPECT_EQ(store().countOpenEpisodes(), 0U);
}

TEST_F(EpisodeTest, ItStaysOpenWhileTheAgentHoldsMoreOfIt) {
    take({makeQueueFull(gcPortA, gcBase, gcBase)});
    std::vector<std::pair<ZTSInitiator, ZTCKindKey>> lAsked;
    inTransaction([&] {
        EXPECT_EQ(store().closeEpisodes(fromMicroseconds(gcBase + gcDay),
                                        [&](const ZTSInitiator& acrInitiator, ZTCKindKey aKind) {
                                            lAsked.emplace_back(acrInitiator, aKind);
                                            return false;
                                        }),
                  0U);
    });
    ASSERT_EQ(lAsked.size(), 1U);
    EXPECT_EQ(lAsked[0].first.mWwpn, makeName(gcLocalPort));
    EXPECT_EQ(lAsked[0].second, gcQueueFull);
    EXPECT_EQ(episodes()[0].mPhase, ZTP_Open);
}

TEST_F(EpisodeTest, ARecordWithinTheGapOfAClosedEpisodeBeginsAnother) {
    take({makeQueueFull(gcPortA, gcBase, gcBase)});
    closeAt(gcBase + 61 * gcSecond);
    take({makeQueueFull(gcPortA, gcBase + gcSecond, gcBase + gcSecond)});
    const auto lEpisodes = episodes();
    ASSERT_EQ(lEpisodes.size(), 2U);
    EXPECT_EQ(lEpisodes[0].mCount, 1U);
    EXPECT_EQ(lEpisodes[1].mPhase, ZTP_Open);
}

TEST_F(EpisodeTest, AClockThatWasSetBackDoesNotKeepItOpenForEver) {
    take({makeQueueFull(gcPortA, gcBase + gcDay, gcBase + gcDay)}, gcBase + gcDay);
    EXPECT_EQ(closeAt(gcBase), 0U);
    EXPECT_EQ(closeAt(gcBase + 60 * gcSecond), 0U);
    EXPECT_EQ(closeAt(gcBase + 61 * gcSecond), 1U);
}

TEST_F(EpisodeTest, AClockThatWasSetBackTwiceDoesNotKeepItOpenForEver) {
    take({makeQueueFull(gcPortA, gcBase + gcDay, gcBase + gcDay)}, gcBase + gcDay);
    EXPECT_EQ(closeAt(gcBase + gcDay / 2), 0U);
    EXPECT_EQ(closeAt(gcBase), 0U);
    EXPECT_EQ(closeAt(gcBase + 60 * gcSecond), 0U);
    EXPECT_EQ(closeAt(gcBase + 61 * gcSecond), 1U);
}

TEST_F(EpisodeTest, AnEpisodeThatGoesOnAfterTheClockWasSetBackStaysOpenUntilItIsQuiet) {
    take({makeQueueFull(gcPortA, gcBase + gcDay, gcBase + gcDay)}, gcBase + gcDay);
    EXPECT_EQ(closeAt(gcBase), 0U);
    take({makeQueueFull(gcPortA, gcBase + 50 * gcSecond, gcBase + 50 * gcSecond)}, gcBase + 50 * gcSecond);
    EXPECT_EQ(closeAt(gcBase + 61 * gcSecond), 0U);
    EXPECT_EQ(closeAt(gcBase + 122 * gcSecond), 1U);
}

TEST_F(EpisodeTest, ARecordWhoseLastTimeLiesBeforeItsFirstIsKeptAndFlagged) {
    take({makeQueueFull(gcPortA, gcBase + gcDay, gcBase, 4)});
    const auto lEpisodes = episodes();
    ASSERT_EQ(lEpisodes.size(), 1U);
    EXPECT_TRUE(lEpisodes[0].mHasClockFlag);
    EXPECT_EQ(lEpisodes[0].mCount, 4U);
    EXPECT_EQ(toMicroseconds(lEpisodes[0].mFirst), gcBase + gcDay);
    EXPECT_EQ(toMicroseconds(lEpisodes[0].mLast), gcBase);
    const auto lRecords = records();
    ASSERT_EQ(lRecords.size(), 1U);
    EXPECT_TRUE(lRecords[0].mHasClockFlag);
}

TEST_F(EpisodeTest, ChangesAreOneAtTheOpeningOneAMinuteWhileItGrowsAndOneAtTheClosing) {
    take({makeQueueFull(gcPortA, gcBase, gcBase)}, gcBase);
    ASSERT_EQ(changes().size(), 1U);
    const std::uint64_t lOpened = changes()[0].mSeq;
    take({makeQueueFull(gcPortA, gcBase + 30 * gcSecond, gcBase + 30 * gcSecond)}, gcBase + 59 * gcSecond);
    EXPECT_EQ(changes().size(), 1U);
    take({makeQueueFull(gcPortA, gcBase + 60 * gcSecond, gcBase + 60 * gcSecond)}, gcBase + 60 * gcSecond);
    ASSERT_EQ(changes().size(), 2U);
    EXPECT_EQ(changes()[1].mPhase, ZTP_Update);
    EXPECT_EQ(episodes()[0].mPhase, ZTP_Update);
    EXPECT_EQ(episodes()[0].mSeq, changes()[1].mSeq);
    const std::uint64_t lUpdated = changes()[1].mSeq;
    take({makeQueueFull(gcPortA, gcBase + 120 * gcSecond, gcBase + 120 * gcSecond)}, gcBase + 120 * gcSecond);
    ASSERT_EQ(changes().size(), 2U) << "a newer update replaces an older one";
    EXPECT_GT(changes()[1].mSeq, lUpdated);
    closeAt(gcBase + gcDay);
    const auto lChanges = changes();
    ASSERT_EQ(lChanges.size(), 3U);
    EXPECT_EQ(lChanges[0].mPhase, ZTP_Open);
    EXPECT_EQ(lChanges[0].mSeq, lOpened);
    EXPECT_EQ(lChanges[2].mPhase, ZTP_Closed);
    EXPECT_EQ(episodes()[0].mSeq, lChanges[2].mSeq);
    ZTSHistoryFilter lFilter;
    lFilter.mAfterSeq = lChanges[1].mSeq;
    ASSERT_EQ(changes(lFilter).size(), 1U);
    EXPECT_EQ(changes(lFilter)[0].mCount, 4U);
}

TEST_F(EpisodeTest, AfterTheClockWasSetBackItsGrowthIsAChangeWithinAMinute) {
    take({makeQueueFull(gcPortA, gcBase, gcBase)}, gcBase);
    take({makeQueueFull(gcPortA, gcBase, gcBase)}, gcBase - gcDay);
    ASSERT_EQ(changes().size(), 1U);
    take({makeQueueFull(gcPortA, gcBase, gcBase)}, gcBase - gcDay + 60 * gcSecond);
    EXPECT_EQ(changes().size(), 2U);
}

TEST_F(EpisodeTest, OfALongEpisodeExactlyTheFirstAndTheLastRecordsAreKept) {
    mLimits.mRecordsPerEnd = 2;
    store().setLimits(mLimits);
    for (std::int64_t i = 0; i < 10; ++i) {
        take({makeQueueFull(gcPortA, gcBase + i * gcSecond, gcBase + i * gcSecond)}, gcBase + i * gcSecond);
    }
    std::vector<std::uint64_t> lOrdinals;
    for (const auto& lrRecord : records()) {
        lOrdinals.push_back(lrRecord.mOrdinal);
    }
    EXPECT_EQ(lOrdinals, (std::vector<std::uint64_t>{0, 1, 8, 9}));
}

TEST_F(EpisodeTest, OfALongEpisodeTheRowsFromBeforeARestartAreDeletedInTheirTurn) {
    mLimits.mRecordsPerEnd = 2;
    const auto lTakeOne = [&](std::int64_t aNumber) {
        const std::int64_t lTime = gcBase + aNumber * gcSecond;
        take({makeQueueFull(gcPortA, lTime, lTime)}, lTime);
    };
    const auto lCountRows = [this] {
        return ZTCDatabase(path(), ZTDA_ReadOnly).readNumber("SELECT count(*) FROM record");
    };
    for (std::int64_t i = 0; i < 10; ++i) {
        lTakeOne(i);
    }
    const std::int64_t lRows = lCountRows();
    EXPECT_GT(lRows, 0);
    closeStore();
    for (std::int64_t i = 10; i < 20; ++i) {
        lTakeOne(i);
    }
    EXPECT_EQ(lCountRows(), lRows);
    EXPECT_EQ(episodes().size(), 1U);
}

TEST_F(EpisodeTest, ALongEpisodeOfOneFrameKeepsAsManyRecordsAtItsEnd) {
    mLimits.mRecordsPerEnd = 2;
    store().setLimits(mLimits);
    std::vector<ZTSTestRecord> lFrame;
    for (std::int64_t i = 0; i < 10; ++i) {
        lFrame.push_back(makeQueueFull(gcPortA, gcBase + i * gcSecond, gcBase + i * gcSecond));
    }
    take(lFrame);
    EXPECT_EQ(records().size(), 4U);
}

TEST_F(EpisodeTest, NumbersGoOnRisingAfterARestart) {
    take({makeQueueFull(gcPortA, gcBase, gcBase)});
    const ZTSEpisode lBefore = episodes()[0];
    const std::uint64_t lLastSeq = history().getLastSeq();
    closeStore();
    take({makeQueueFull(gcPortB, gcBase, gcBase)});
    const ZTSEpisode lAfter = episodes()[1];
    EXPECT_GT(lAfter.mEpisode, lBefore.mEpisode);
    EXPECT_GT(lAfter.mSeq, lLastSeq);
}

TEST_F(EpisodeTest, AnOpenEpisodeGoesOnAfterARestart) {
    take({makeQueueFull(gcPortA, gcBase, gcBase, 2, 1)});
    closeStore();
    EXPECT_EQ(store().countOpenEpisodes(), 1U);
    take({makeQueueFull(gcPortA, gcBase + gcSecond, gcBase + gcSecond, 3, 2)});
    const auto lEpisodes = episodes();
    ASSERT_EQ(lEpisodes.size(), 1U);
    EXPECT_EQ(lEpisodes[0].mCount, 5U);
    EXPECT_EQ(lEpisodes[0].mDetail.mLuns->mNumbers, (std::vector<std::uint32_t>{1, 2}));
}

#include "libkpm/linux/src/FcMessage.h"

#include <algorithm>

static constexpr std::size_t scNetlinkHeader = 16;
static constexpr std::size_t scTransportHeader = 8;
static constexpr std::size_t scEventData = 52;
static constexpr std::uint64_t scScsiTransportType = 0x11;  // the family's one type
static constexpr std::uint64_t scVersion = 1;
static constexpr std::uint64_t scFcTransport = 1;
static constexpr std::uint64_t scMagic = 0xA1B2;
static constexpr std::uint64_t scAsyncEvent = 0x100;

static std::uint64_t sLoad(ZTCByteSpan aBytes, std::size_t aOffset, std::size_t aSize, std::endian aOrder) {
    return loadUnsigned(aBytes, aOffset, aSize, aOrder).value_or(0);
}

std::optional<ZTSLinuxFcEvent> ZTCLinuxFcMessages::next() {
    while (!mRest.empty()) {
        const std::optional<std::uint64_t> lLength = loadUnsigned(mRest, 0, 4, mOrder);
        if (!lLength || *lLength < scNetlinkHeader || *lLength > mRest.size()) {
            ++mMalformed;
            mRest = {};
            return std::nullopt;
        }
        const ZTCByteSpan lMessage = mRest.first(static_cast<std::size_t>(*lLength));
        const std::size_t lPadded = (lMessage.size() + 3) / 4 * 4;
        mRest = mRest.subspan(std::min(lPadded, mRest.size()));
        if (const std::optional<ZTSLinuxFcEvent> lEvent = parse(lMessage)) {
            return lEvent;
        }
    }
    return std::nullopt;
}

std::optional<ZTSLinuxFcEvent> ZTCLinuxFcMessages::parse(ZTCByteSpan aMessage) {
    if (sLoad(aMessage, 4, 2, mOrder) != scScsiTransportType) {
        return std::nullopt;
    }
    if (aMessage.size() < scNetlinkHeader + scTransportHeader || sLoad(aMessage, 16, 1, mOrder) != scVersion ||
        sLoad(aMessage, 18, 2, mOrder) != scMagic) {
        ++mMalformed;
        return std::nullopt;
    }
    if (sLoad(aMessage, 17, 1, mOrder) != scFcTransport || sLoad(aMessage, 20, 2, mOrder) != scAsyncEvent) {
        return std::nullopt;
    }
    if (aMessage.size() < scEventData) {
        ++mMalformed;
        return std::nullopt;
    }
    const auto lDataLength = static_cast<std::size_t>(sLoad(aMessage, 42, 2, mOrder));
    if (lDataLength > aMessage.size() - scEventData) {
        ++mMalformed;
        return std::nullopt;
    }
    ZTSLinuxFcEvent lEvent;
    lEvent.mHost = static_cast<std::uint32_t>(sLoad(aMessage, 40, 2, mOrder));
    lEvent.mNumber = static_cast<std::uint32_t>(sLoad(aMessage, 44, 4, mOrder));
    lEvent.mCode = static_cast<std::uint32_t>(sLoad(aMessage, 48, 4, mOrder));
    lEvent.mData = aMessage.subspan(scEventData, lDataLength);
    return lEvent;
}

std::optional<std::vector<std::uint8_t>> makeLinuxRscn(ZTCByteSpan aData, std::endian aOrder) {
    static constexpr std::size_t scHeader = 4;
    static constexpr std::size_t scPage = 4;
    static constexpr std::size_t scMostBytes = 0xFFFF;
    if (aData.empty() || aData.size() % scPage != 0 || aData.size() > scMostBytes - scHeader) {
        return std::nullopt;
    }
    const std::size_t lLength = scHeader + aData.size();
    std::vector<std::uint8_t> lPayload(lLength);
    lPayload[0] = 0x61;
    lPayload[1] = scPage;
    lPayload[2] = static_cast<std::uint8_t>(lLength >> 8);
    lPayload[3] = static_cast<std::uint8_t>(lLength);
    for (std::size_t lOffset = 0; lOffset < aData.size(); lOffset += scPage) {
        const std::uint64_t lPage = sLoad(aData, lOffset, scPage, aOrder);
        for (std::size_t lByte = 0; lByte < scPage; ++lByte) {
            lPayload[scHeader + lOffset + lByte] = static_cast<std::uint8_t>(lPage >> (24 - 8 * lByte));
        }
    }
    return lPayload;
}

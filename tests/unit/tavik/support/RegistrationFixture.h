/// What the tests of registering and unregistering share: the calls and the log lines of each kind.
#ifndef TESTS_UNIT_TAVIK_SUPPORT_REGISTRATIONFIXTURE_H
#define TESTS_UNIT_TAVIK_SUPPORT_REGISTRATIONFIXTURE_H

#include <cstddef>
#include <map>
#include <stdexcept>
#include <string>
#include <vector>

#include "tavik/include/TavikCore.h"
#include "tests/support/EventKinds.h"
#include "tests/unit/tavik/support/TavikFixture.h"

/// How a kind is registered per board, written down independently of the agent.
struct ZTSBoardKind {
    unsigned mType;
    unsigned mSize;
    std::string mFailedName;
    std::string mRegisteredName;
    KPM_EventCallback mpCallback;
};

inline const std::vector<ZTSBoardKind>& boardKinds() {
    static const auto& srKinds = *new std::vector<ZTSBoardKind>{
        {2, 1024, "RSCN", "RSCN", reinterpret_cast<KPM_EventCallback>(&ScopeCb_KpmRscn)},
        {1, 168, "LINK", "LINK", reinterpret_cast<KPM_EventCallback>(&ScopeCb_KpmLink)},
        {32, 0, "TEMPERATURE", "Temperature Event", reinterpret_cast<KPM_EventCallback>(&ScopeCb_KpmTemp)},
    };
    return srKinds;
}

inline const ZTSBoardKind& boardKind(unsigned aType) {
    for (const ZTSBoardKind& lcrKind : boardKinds()) {
        if (lcrKind.mType == aType) {
            return lcrKind;
        }
    }
    throw std::runtime_error("no such board kind");
}

inline std::string ofInitiator(unsigned aBoard) {
    return " for Initiator <" + ZTCAdaptersLibraryDouble::namesText(aBoard) + ">";
}

/// The call that registers a kind, as the double notes it.
inline std::string registerCallOf(unsigned aBoard, const ZTSTestKind& acrKind) {
    if (acrKind.mRegisteredCategory == 0) {
        return "KpmRegEvent board " + std::to_string(aBoard) + " type " +
               std::to_string(acrKind.mRegisteredSubcategory) + " context 65535 size " +
               std::to_string(boardKind(acrKind.mRegisteredSubcategory).mSize);
    }
    return "ZtapiRegEvent board " + std::to_string(aBoard) + " port " +
           wwnText(ZTCAdaptersLibraryDouble::portName(aBoard)) + " kind " +
           std::to_string(acrKind.mRegisteredCategory) + "/" + std::to_string(acrKind.mRegisteredSubcategory) +
           " preset 0";
}

inline std::string pairText(const ZTSTestKind& acrKind) {
    return "(" + std::to_string(acrKind.mRegisteredCategory) + ", " + std::to_string(acrKind.mRegisteredSubcategory) +
           ")";
}

inline std::string registeredText(unsigned aBoard, const ZTSTestKind& acrKind) {
    return "-N- Registered " +
           (acrKind.mRegisteredCategory == 0 ? boardKind(acrKind.mRegisteredSubcategory).mRegisteredName
                                             : "event " + pairText(acrKind)) +
           ofInitiator(aBoard);
}

inline unsigned keyFormOf(const ZTSTestKind& acrKind) {
    return unsigned{acrKind.mRegisteredCategory} << 8 | acrKind.mRegisteredSubcategory;
}

inline ZTCRegistrationKey registrationKeyOf(unsigned aBoard, const ZTSTestKind& acrKind) {
    return {aBoard, acrKind.mRegisteredCategory, acrKind.mRegisteredSubcategory};
}

class ZTCRegistrationFixture : public ZTCTavikFixture {
protected:
    using ZTCRegistrations = std::map<unsigned, unsigned>;  ///< key form to handle

    ZTCRegistrations registrations(unsigned aBoard) const {
        ZTCRegistrations lRegistrations;
        const ZTCTavikInitiator& lcrInitiator = *mSystem->getFcInitiator(aBoard);
        for (auto lEntry = lcrInitiator.r_begin(); lEntry != lcrInitiator.r_end(); ++lEntry) {
            lRegistrations[lEntry->first] = lEntry->second;
        }
        return lRegistrations;
    }

    /// What the double gave out for a board, as far as it was asked.
    ZTCRegistrations givenHandles(unsigned aBoard) const {
        ZTCRegistrations lHandles;
        for (const auto& [lcrKey, lHandle] : mLibrary.mHandles) {
            const auto [lBoard, lCategory, lSubcategory] = lcrKey;
            if (lBoard == aBoard) {
                lHandles[lCategory << 8 | lSubcategory] = lHandle;
            }
        }
        return lHandles;
    }

    /// Calls and notices of the boards before `aBoards`, and of that board up to and without `aKinds` kinds.
    static std::vector<std::string> callsUpTo(unsigned aBoards, std::size_t aKinds) {
        std::vector<std::string> lCalls;
        walkUpTo(aBoards, aKinds, [&](unsigned aBoard, const ZTSTestKind& acrKind) {
            lCalls.push_back(registerCallOf(aBoard, acrKind));
        });
        return lCalls;
    }
    static std::vector<std::string> noticesUpTo(unsigned aBoards, std::size_t aKinds) {
        std::vector<std::string> lNotices;
        walkUpTo(aBoards, aKinds, [&](unsigned aBoard, const ZTSTestKind& acrKind) {
            lNotices.push_back(registeredText(aBoard, acrKind));
        });
        return lNotices;
    }

    std::string startHex(unsigned aMaxEventDataSize = 4096) {
        return hexOf(request(ZTCByteWriter().u8(0).u32(aMaxEventDataSize).bytes()));
    }

    void addRegistration(unsigned aBoard, unsigned char aCategory, unsigned char aSubcategory, unsigned aHandle) {
        mSystem->getFcInitiator(aBoard)->addRegEvent(
            ZTCPointer<ZTCScopeEvent>(new ZTCScopeEvent(aCategory, aSubcategory)), aHandle);
    }

    void unregister() {
        mLog.forget();
        mLibrary.forgetCalls();
        mSystem->getProtocolHandler()->handleUnregisterEvents();
    }

    static std::string unregisterCall(unsigned aBoard, unsigned aHandle) {
        return "ZtapiUnregEvent board " + std::to_string(aBoard) + " port " +
               wwnText(ZTCAdaptersLibraryDouble::portName(aBoard)) + " handle " + std::to_string(aHandle);
    }
    static std::string unregisterBoardCall(unsigned aBoard, unsigned aHandle) {
        return "KpmUnregEvent board " + std::to_string(aBoard) + " handle " + std::to_string(aHandle);
    }

private:
    template <typename TDo>
    static void walkUpTo(unsigned aBoards, std::size_t aKinds, TDo aDo) {
        for (unsigned lBoard = 0; lBoard <= aBoards; ++lBoard) {
            for (std::size_t lKind = 0; lKind < (lBoard < aBoards ? gcTestKinds.size() : aKinds); ++lKind) {
                aDo(lBoard, gcTestKinds[lKind]);
            }
        }
    }
};

#endif

#include "fuzz/support/FuzzAgent.h"

#include <dlfcn.h>
#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cstdlib>
#include <string>

#include "common/include/Exception.h"
#include "common/include/Log.h"
#include "fuzz/support/FuzzInput.h"
#include "sensor/client/include/CommandEncoder.h"
#include "sensor/client/include/ResponseDecoder.h"
#include "system/include/SystemGlobals.h"
#include "tavik/include/TavikProtocolHandler.h"

void discardLog(unsigned aLogCode) {
    static const bool slIsSet = [] {
        setLogFilePath("/dev/null");
        return true;
    }();
    setLogCode(slIsSet ? aLogCode : gcNoLog);
}

const std::string& getFuzzDirectory() {
    static const std::string& srDirectory = *new std::string([] {
        const char* lpParent = std::getenv("TMPDIR");
        std::string lPath = std::string(lpParent == nullptr ? "/tmp" : lpParent) + "/tavik-fuzz-XXXXXX";
        ZT_FUZZ_REQUIRE(::mkdtemp(lPath.data()) != nullptr, lPath);
        return lPath;
    }());
    return srDirectory;
}

/// What a process needs once: the environment, the module, and a reader of the response FIFO.
static ZTSFuzzLibkpm* sPrepare() {
    static ZTSFuzzLibkpm* const slpLibrary = [] {
        ::setenv("ZT_QRV_SENSOR_DIR", getFuzzDirectory().c_str(), 1);
        ::setenv("ZT_LIBKPM_PATH", TAVIK_FUZZ_LIBKPM, 1);
        const std::string lResponses = getFuzzDirectory() + "/qrvtvkout.fifo";
        ZT_FUZZ_REQUIRE(::mkfifo(lResponses.c_str(), 0600) == 0, lResponses);
        ZT_FUZZ_REQUIRE(::open(lResponses.c_str(), O_RDONLY | O_NONBLOCK | O_CLOEXEC) >= 0, lResponses);
        void* lpModule = ::dlopen(TAVIK_FUZZ_LIBKPM, RTLD_NOW | RTLD_LOCAL);
        ZT_FUZZ_REQUIRE(lpModule != nullptr, ::dlerror());
        return reinterpret_cast<ZTPFuzzLibkpm>(::dlsym(lpModule, gcFuzzLibkpmSymbol))();
    }();
    return slpLibrary;
}

ZTCFuzzAgent::ZTCFuzzAgent(unsigned aAdapters, unsigned aLogCode)
    : mpSystem(std::make_unique<ZTCTavikSystem>(ZTCString(gcTavikName))), mpLibrary(sPrepare()) {
    *mpLibrary = ZTSFuzzLibkpm{};
    mpLibrary->mAdapters = aAdapters;
    discardLog(gcNoLog);
    setSystemObject(mpSystem.get());
    mpSystem->preInit();
    setLogCode(gcNoLog);  // preInit has set its own
    mpSystem->init();
    setLogCode(aLogCode);
}

ZTCFuzzAgent::~ZTCFuzzAgent() {
    setLogCode(gcNoLog);
    mDoScopeCollection = false;
    mpSystem->getLibkpmAbs()->LIBKPM_FreeLibrary();
    gpTavikSystem = nullptr;
    setSystemObject(nullptr);
}

std::optional<ZTSResponse> ZTCFuzzAgent::request(std::span<const std::uint8_t> aBody) {
    ZTCPointer<ZTCBuffer> lRequest(new ZTCBuffer(static_cast<Size>(aBody.size())));
    lRequest->append(aBody.data(), static_cast<Size>(aBody.size()));
    ZTCPointer<ZTCBuffer> lResponse;
    try {
        mpSystem->getProtocolHandler()->process(lRequest, lResponse);
    } catch (const ZTCException&) {
        return std::nullopt;
    }
    ZTSResponse lDecoded = decodeResponse({lResponse->getData(), lResponse->getSize()});
    ZT_FUZZ_REQUIRE(lDecoded.mUnreadBytes == 0, std::to_string(lDecoded.mUnreadBytes));
    return lDecoded;
}

ZTSResponse ZTCFuzzAgent::retrieve() {
    std::optional<ZTSResponse> lResponse = request(encodeGetScopeData());
    ZT_FUZZ_REQUIRE(lResponse && lResponse->mOutcome == ZTRO_ScopeData, "a retrieval was not answered");
    return std::move(*lResponse);
}

void ZTCFuzzAgent::startScope(std::uint32_t aMaxRecordBytes) {
    const std::optional<ZTSResponse> lResponse = request(encodeStartScope(aMaxRecordBytes));
    ZT_FUZZ_REQUIRE(lResponse && lResponse->mOutcome == ZTRO_Success, "a start command was refused");
}

#include "tests/unit/linux/KernelBytes.h"

void putNumber(ZTCBytes& arBytes, std::uint64_t aNumber, std::size_t aSize, std::endian aOrder) {
    for (std::size_t lByte = 0; lByte < aSize; ++lByte) {
        const std::size_t lPlace = aOrder == std::endian::big ? aSize - 1 - lByte : lByte;
        arBytes.push_back(static_cast<std::uint8_t>(aNumber >> (8 * lPlace)));
    }
}

ZTCBytes ZTSFcMessage::make() const {
    const std::size_t lEvent = (36 + mData.size() + 7) / 8 * 8;
    ZTCBytes lBytes;
    putNumber(lBytes, 16 + lEvent, 4, mOrder);  // netlink header
    putNumber(lBytes, 0x11, 2, mOrder);
    putNumber(lBytes, 0, 2, mOrder);
    putNumber(lBytes, 0, 8, mOrder);
    putNumber(lBytes, 1, 1, mOrder);  // SCSI transports' header
    putNumber(lBytes, 1, 1, mOrder);
    putNumber(lBytes, 0xA1B2, 2, mOrder);
    putNumber(lBytes, 0x100, 2, mOrder);
    putNumber(lBytes, lEvent, 2, mOrder);
    putNumber(lBytes, 1700000000, 8, mOrder);  // event
    putNumber(lBytes, 0, 8, mOrder);
    putNumber(lBytes, mHost, 2, mOrder);
    putNumber(lBytes, mData.size(), 2, mOrder);
    putNumber(lBytes, mNumber, 4, mOrder);
    putNumber(lBytes, mCode, 4, mOrder);
    lBytes.insert(lBytes.end(), mData.begin(), mData.end());
    lBytes.resize(16 + lEvent);
    return lBytes;
}

ZTCBytes rscnData(std::uint32_t aPage, std::endian aOrder) {
    ZTCBytes lData;
    putNumber(lData, aPage, 4, aOrder);
    return lData;
}

std::string doneFormat(bool aHasSense) {
    std::string lText =
        "name: scsi_dispatch_cmd_done\n"
        "ID: 385\n"
        "format:\n"
        "\tfield:unsigned short common_type;\toffset:0;\tsize:2;\tsigned:0;\n"
        "\tfield:unsigned char common_flags;\toffset:2;\tsize:1;\tsigned:0;\n"
        "\tfield:unsigned char common_preempt_count;\toffset:3;\tsize:1;\tsigned:0;\n"
        "\tfield:int common_pid;\toffset:4;\tsize:4;\tsigned:1;\n"
        "\n"
        "\tfield:unsigned int host_no;\toffset:8;\tsize:4;\tsigned:0;\n"
        "\tfield:unsigned int channel;\toffset:12;\tsize:4;\tsigned:0;\n"
        "\tfield:unsigned int id;\toffset:16;\tsize:4;\tsigned:0;\n"
        "\tfield:unsigned int lun;\toffset:20;\tsize:4;\tsigned:0;\n"
        "\tfield:int result;\toffset:24;\tsize:4;\tsigned:1;\n"
        "\tfield:unsigned int opcode;\toffset:28;\tsize:4;\tsigned:0;\n"
        "\tfield:unsigned int cmd_len;\toffset:32;\tsize:4;\tsigned:0;\n"
        "\tfield:int driver_tag;\toffset:36;\tsize:4;\tsigned:1;\n"
        "\tfield:int scheduler_tag;\toffset:40;\tsize:4;\tsigned:1;\n"
        "\tfield:unsigned int data_sglen;\toffset:44;\tsize:4;\tsigned:0;\n"
        "\tfield:unsigned int prot_sglen;\toffset:48;\tsize:4;\tsigned:0;\n"
        "\tfield:unsigned char prot_op;\toffset:52;\tsize:1;\tsigned:0;\n"
        "\tfield:__data_loc unsigned char[] cmnd;\toffset:56;\tsize:4;\tsigned:0;\n";
    if (aHasSense) {
        lText +=
            "\tfield:u8 sense_key;\toffset:60;\tsize:1;\tsigned:0;\n"
            "\tfield:u8 asc;\toffset:61;\tsize:1;\tsigned:0;\n"
            "\tfield:u8 ascq;\toffset:62;\tsize:1;\tsigned:0;\n";
    }
    return lText + "\nprint fmt: \"host_no=%u channel=%u\", REC->host_no, REC->channel\n";
}

std::string headerPage() {
    return "\tfield: u64 timestamp;\toffset:0;\tsize:8;\tsigned:0;\n"
           "\tfield: local_t commit;\toffset:8;\tsize:8;\tsigned:1;\n"
           "\tfield: int overwrite;\toffset:8;\tsize:1;\tsigned:1;\n"
           "\tfield: char data;\toffset:16;\tsize:4080;\tsigned:1;\n";
}

ZTCBytes ZTSDoneRecord::make() const {
    ZTCBytes lBytes;
    putNumber(lBytes, mId, 2, mOrder);
    putNumber(lBytes, 0, 2, mOrder);
    putNumber(lBytes, 4711, 4, mOrder);
    for (const std::uint32_t lNumber :
         {mHost, mChannel, mTarget, mLun, mResult, mOpcode, 10u, mDriverTag, mSchedulerTag, 1u, 0u, 0u}) {
        putNumber(lBytes, lNumber, 4, mOrder);
    }
    putNumber(lBytes, 10u << 16 | (mHasSense ? 63u : 60u), 4, mOrder);
    if (mHasSense) {
        lBytes.insert(lBytes.end(), {mSenseKey, mAsc, mAscq});
    }
    lBytes.insert(lBytes.end(), {0x28, 0, 0x0F, 0xFF, 0xFF, 0xFF, 0, 0, 1, 0});  // the command
    lBytes.resize((lBytes.size() + 3) / 4 * 4);
    return lBytes;
}

std::string senseFormat() {
    return "name: check_sense\n"
           "ID: 1742\n"
           "format:\n"
           "\tfield:unsigned short common_type;\toffset:0;\tsize:2;\tsigned:0;\n"
           "\tfield:unsigned long __probe_ip;\toffset:8;\tsize:8;\tsigned:0;\n"
           "\tfield:u32 host;\toffset:16;\tsize:4;\tsigned:0;\n"
           "\tfield:u32 channel;\toffset:20;\tsize:4;\tsigned:0;\n"
           "\tfield:u32 id;\toffset:24;\tsize:4;\tsigned:0;\n"
           "\tfield:u64 lun;\toffset:28;\tsize:8;\tsigned:0;\n"
           "\tfield:u32 result;\toffset:36;\tsize:4;\tsigned:0;\n"
           "\tfield:u8 opcode;\toffset:40;\tsize:1;\tsigned:0;\n"
           "\tfield:s32 driver_tag;\toffset:41;\tsize:4;\tsigned:1;\n"
           "\tfield:s32 scheduler_tag;\toffset:45;\tsize:4;\tsigned:1;\n"
           "\tfield:u8 sense[20];\toffset:49;\tsize:20;\tsigned:0;\n"
           "\nprint fmt: \"(%lx) host=%u\", REC->__probe_ip, REC->host\n";
}

ZTCBytes ZTSSenseRecordBytes::make() const {
    ZTCBytes lBytes;
    putNumber(lBytes, gcSenseId, 2, mOrder);
    lBytes.resize(16);
    for (const std::uint32_t lNumber : {mHost, mChannel, mTarget}) {
        putNumber(lBytes, lNumber, 4, mOrder);
    }
    putNumber(lBytes, mLun, 8, mOrder);
    putNumber(lBytes, 2, 4, mOrder);
    putNumber(lBytes, mOpcode, 1, mOrder);
    putNumber(lBytes, mDriverTag, 4, mOrder);
    putNumber(lBytes, mSchedulerTag, 4, mOrder);
    lBytes.insert(lBytes.end(), {0x70, 0, mSenseKey, 0, 0, 0, 0, 10, 0, 0, 0, 0, mAsc, mAscq, 0, 0, 0, 0, 0, 0});
    return lBytes;
}

ZTCPageBuilder& ZTCPageBuilder::addWord(std::uint32_t aType, std::uint32_t aTime) {
    putNumber(mData, mOrder == std::endian::big ? aType << 27 | aTime : aTime << 5 | aType, 4, mOrder);
    return *this;
}

ZTCPageBuilder& ZTCPageBuilder::addNumber(std::uint32_t aNumber) {
    putNumber(mData, aNumber, 4, mOrder);
    return *this;
}

ZTCPageBuilder& ZTCPageBuilder::addShort(const ZTCBytes& acrData) {
    const std::size_t lWords = (acrData.size() + 3) / 4;
    addWord(static_cast<std::uint32_t>(lWords), 17);
    mData.insert(mData.end(), acrData.begin(), acrData.end());
    mData.resize(mData.size() + lWords * 4 - acrData.size());
    return *this;
}

ZTCPageBuilder& ZTCPageBuilder::addLong(const ZTCBytes& acrData) {
    addWord(0, 17);
    addNumber(static_cast<std::uint32_t>(acrData.size() + 4));
    mData.insert(mData.end(), acrData.begin(), acrData.end());
    return *this;
}

ZTCBytes ZTCPageBuilder::make(std::uint64_t aMarks) const {
    return makeWithLength(mData.size() | aMarks);
}

ZTCBytes ZTCPageBuilder::makeWithLength(std::uint64_t aCommit) const {
    ZTCBytes lPage;
    putNumber(lPage, 123456789, 8, mOrder);
    putNumber(lPage, aCommit, 8, mOrder);
    lPage.insert(lPage.end(), mData.begin(), mData.end());
    lPage.resize(4096, 0xEE);
    return lPage;
}

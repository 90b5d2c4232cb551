/*
 * scripted-target: a disk behind the kernel's user-space backstore whose commands say how they are to be answered.
 *   scripted-target UIO-DEVICE MAP-BYTES ANSWERS-FILE
 * The block address of a READ(10) is its answer: status, sense key, additional sense code, qualifier. Its group number
 * (byte 6) is how often in a row: then comes one GOOD, as the initiator repeats what was answered with busy; 0: always.
 * Status 0xFF: no answer for some seconds, then GOOD.
 * Each answer is a line of the file, before it is given: status, sense key, additional sense code, qualifier, in
 * decimal.
 */
#include <errno.h>
#include <fcntl.h>
#include <linux/target_core_user.h>
#include <poll.h>
#include <stddef.h>
#include <stdint.h>
#include <stdio.h>
#include <stdlib.h>
#include <string.h>
#include <sys/mman.h>
#include <unistd.h>

enum { gcGood = 0x00, gcCheckCondition = 0x02, gcUnanswered = 0xFF, gcUnansweredMilliseconds = 4000 };

typedef struct ZTSAnswer {
    uint8_t mStatus;
    uint8_t mKey;
    uint8_t mAsc;
    uint8_t mAscq;
    size_t mLength;
    const void* mpData;
} ZTSAnswer;

static const ZTSAnswer scGood = {.mStatus = gcGood};
static const ZTSAnswer scUnknownCommand = {gcCheckCondition, 5, 0x20, 0, 0, NULL};
static const ZTSAnswer scUnknownPage = {gcCheckCondition, 5, 0x24, 0, 0, NULL};

/* INQUIRY, the list of its pages, MODE SENSE(6), READ CAPACITY(10): a disk of 2048 blocks of 512 bytes. */
static const ZTSAnswer scIdentity = {gcGood, 0, 0, 0, 36, "\0\0\5\2\x1f\0\0\2SCRIPTEDTARGET          1   "};
static const ZTSAnswer scPages = {gcGood, 0, 0, 0, 5, "\0\0\0\1\0"};
static const ZTSAnswer scModes = {gcGood, 0, 0, 0, 4, "\3\0\0\0"};
static const ZTSAnswer scCapacity = {gcGood, 0, 0, 0, 8, "\0\0\7\xff\0\0\2\0"};

static ZTSAnswer sAnswerRead(const uint8_t* apCdb) {
    static unsigned sAnswered = 0;
    if (apCdb[6] != 0 && sAnswered++ == apCdb[6]) {
        sAnswered = 0;
        return scGood;
    }
    return (ZTSAnswer){apCdb[2], apCdb[3], apCdb[4], apCdb[5], 0, NULL};
}

static ZTSAnswer sAnswer(const uint8_t* apCdb) {
    switch (apCdb[0]) {
        case 0x00: /* TEST UNIT READY */
        case 0x2A: /* WRITE(10) */
            return scGood;
        case 0x12:
            if ((apCdb[1] & 1) == 0) {
                return scIdentity;
            }
            return apCdb[2] == 0 ? scPages : scUnknownPage;
        case 0x1A:
            return scModes;
        case 0x25:
            return scCapacity;
        case 0x28:
            return sAnswerRead(apCdb);
        default:
            return scUnknownCommand;
    }
}

static void sNote(int aAnswers, const ZTSAnswer* apAnswer) {
    char lLine[32];
    const int lLength = snprintf(lLine, sizeof lLine, "%u %u %u %u\n", apAnswer->mStatus, apAnswer->mKey,
                                 apAnswer->mAsc, apAnswer->mAscq);
    if (write(aAnswers, lLine, (size_t)lLength) != lLength) {
        fprintf(stderr, "scripted-target: an answer is not noted: %s\n", strerror(errno));
    }
}

static void sRespond(uint8_t* apMap, struct tcmu_cmd_entry* apEntry, int aAnswers) {
    ZTSAnswer lAnswer = sAnswer(apMap + apEntry->req.cdb_off);
    size_t lCopied = 0;
    for (uint32_t lPart = 0; lPart < apEntry->req.iov_cnt; ++lPart) {
        const struct iovec lTo = apEntry->req.iov[lPart];
        const size_t lRest = lAnswer.mLength - lCopied;
        const size_t lLength = lTo.iov_len < lRest ? lTo.iov_len : lRest;
        if (lLength > 0) {
            memcpy(apMap + (uintptr_t)lTo.iov_base, (const uint8_t*)lAnswer.mpData + lCopied, lLength);
        }
        lCopied += lLength;
    }
    if (lAnswer.mStatus == gcUnanswered) {
        poll(NULL, 0, gcUnansweredMilliseconds);
        lAnswer = scGood;
    }
    sNote(aAnswers, &lAnswer);
    memset(&apEntry->rsp, 0, sizeof apEntry->rsp);
    apEntry->rsp.scsi_status = lAnswer.mStatus;
    if (lAnswer.mStatus == gcCheckCondition) {
        apEntry->rsp.sense_buffer[0] = 0x70;
        apEntry->rsp.sense_buffer[2] = (char)lAnswer.mKey;
        apEntry->rsp.sense_buffer[7] = 10;
        apEntry->rsp.sense_buffer[12] = (char)lAnswer.mAsc;
        apEntry->rsp.sense_buffer[13] = (char)lAnswer.mAscq;
    }
}

static void sAnswerAll(uint8_t* apMap, int aAnswers) {
    struct tcmu_mailbox* lpMailbox = (struct tcmu_mailbox*)(void*)apMap;
    volatile uint32_t* lpHead = (volatile uint32_t*)(void*)(apMap + offsetof(struct tcmu_mailbox, cmd_head));
    volatile uint32_t* lpTail = (volatile uint32_t*)(void*)(apMap + offsetof(struct tcmu_mailbox, cmd_tail));
    while (*lpTail != *lpHead) {
        struct tcmu_cmd_entry* lpEntry = (void*)(apMap + lpMailbox->cmdr_off + *lpTail);
        const uint32_t lLength = tcmu_hdr_get_len(lpEntry->hdr.len_op);
        if (tcmu_hdr_get_op(lpEntry->hdr.len_op) == TCMU_OP_CMD) {
            sRespond(apMap, lpEntry, aAnswers);
        }
        __sync_synchronize();
        *lpTail = (*lpTail + lLength) % lpMailbox->cmdr_size;
    }
}

int main(int aArgc, char** appArgv) {
    if (aArgc != 4) {
        fputs("usage: scripted-target UIO-DEVICE MAP-BYTES ANSWERS-FILE\n", stderr);
        return 2;
    }
    const int lAnswers = open(appArgv[3], O_WRONLY | O_CREAT | O_APPEND | O_CLOEXEC, 0644);
    if (lAnswers < 0) {
        fprintf(stderr, "scripted-target: %s: %s\n", appArgv[3], strerror(errno));
        return 1;
    }
    const int lDevice = open(appArgv[1], O_RDWR);
    const size_t lSize = strtoul(appArgv[2], NULL, 0);
    uint8_t* lpMap = lDevice < 0 ? MAP_FAILED : mmap(NULL, lSize, PROT_READ | PROT_WRITE, MAP_SHARED, lDevice, 0);
    for (uint32_t lCount = 0; lpMap != MAP_FAILED;) {
        sAnswerAll(lpMap, lAnswers);
        if (write(lDevice, &lCount, sizeof lCount) < 0 || read(lDevice, &lCount, sizeof lCount) < 0) {
            break;
        }
    }
    fprintf(stderr, "scripted-target: %s: %s\n", appArgv[1], strerror(errno));
    return 1;
}

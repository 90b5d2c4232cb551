/*
 * scsi-repeat: sends one SCSI command without data many times.
 *   scsi-repeat DEVICE TIMES BYTE...     the command's bytes in hexadecimal
 */
#include <errno.h>
#include <fcntl.h>
#include <scsi/sg.h>
#include <stdio.h>
#include <stdlib.h>
#include <string.h>
#include <sys/ioctl.h>

enum { gcMostBytes = 16, gcTimeoutMilliseconds = 20000 };

int main(int aArgc, char** appArgv) {
    if (aArgc < 4 || aArgc > 3 + gcMostBytes) {
        fputs("usage: scsi-repeat DEVICE TIMES BYTE...\n", stderr);
        return 2;
    }
    unsigned char lCommand[gcMostBytes];
    unsigned char lSense[32];
    for (int lByte = 3; lByte < aArgc; ++lByte) {
        lCommand[lByte - 3] = (unsigned char)strtoul(appArgv[lByte], NULL, 16);
    }
    sg_io_hdr_t lRequest = {.interface_id = 'S',
                            .dxfer_direction = SG_DXFER_NONE,
                            .cmd_len = (unsigned char)(aArgc - 3),
                            .mx_sb_len = sizeof lSense,
                            .cmdp = lCommand,
                            .sbp = lSense,
                            .timeout = gcTimeoutMilliseconds};
    const int lDevice = open(appArgv[1], O_RDWR);
    for (unsigned long lLeft = strtoul(appArgv[2], NULL, 10); lLeft > 0; --lLeft) {
        if (lDevice < 0 || ioctl(lDevice, SG_IO, &lRequest) < 0) {
            fprintf(stderr, "scsi-repeat: %s: %s\n", appArgv[1], strerror(errno));
            return 1;
        }
    }
    return 0;
}

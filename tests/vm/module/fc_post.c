/*
 * fc_post: lets the transport class post an FC event, as a driver would.
 *   echo "HOST CODE TIMES HEXBYTES" > /sys/module/fc_post/parameters/post
 * HOST and TIMES are decimal, CODE and the event's data are hexadecimal: "0 5 1 01020300" on a little-endian machine is
 * an RSCN of the page 0x00030201.
 *   echo "HOST NAME" > /sys/module/fc_post/parameters/port_name
 * sets the host's port name, 16 hexadecimal digits, as a driver does when it has found it out.
 */
#include <linux/kernel.h>
#include <linux/module.h>
#include <linux/string.h>
#include <scsi/scsi_host.h>
#include <scsi/scsi_transport_fc.h>

static int sPost(const char* apText, const struct kernel_param* acpParameter) {
    unsigned lHost, lCode, lTimes;
    char lHex[257] = "";
    u8 lData[128];
    size_t lLength;
    struct Scsi_Host* lpHost;

    if (sscanf(apText, "%u %x %u %256s", &lHost, &lCode, &lTimes, lHex) < 3)
        return -EINVAL;
    lLength = strlen(lHex) / 2;
    if (hex2bin(lData, lHex, lLength) != 0)
        return -EINVAL;
    lpHost = scsi_host_lookup(lHost);
    if (!lpHost)
        return -ENODEV;
    while (lTimes-- > 0)
        fc_host_post_fc_event(lpHost, fc_get_event_number(), lCode, lLength, lData, 0);
    scsi_host_put(lpHost);
    return 0;
}

static const struct kernel_param_ops sPostOps = {.set = sPost};
module_param_cb(post, &sPostOps, NULL, 0200);
static int sSetName(const char* apText, const struct kernel_param* acpParameter) {
    unsigned lHost;
    unsigned long long lName;
    struct Scsi_Host* lpHost;

    if (sscanf(apText, "%u %llx", &lHost, &lName) != 2)
        return -EINVAL;
    lpHost = scsi_host_lookup(lHost);
    if (!lpHost)
        return -ENODEV;
    fc_host_port_name(lpHost) = lName;
    scsi_host_put(lpHost);
    return 0;
}

static const struct kernel_param_ops sNameOps = {.set = sSetName};
module_param_cb(port_name, &sNameOps, NULL, 0200);
MODULE_LICENSE("GPL");
MODULE_DESCRIPTION("Posts FC events of the transport class and names its hosts, for tests");

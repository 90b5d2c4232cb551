. /vm/fabric.sh
fabric_up
cat /proc/uptime
for f in /sys/class/fc_host/host*/port_* /sys/class/fc_remote_ports/*/port_*; do echo $f $(cat $f); done
ls -l /sys/class/scsi_device /sys/class/scsi_generic

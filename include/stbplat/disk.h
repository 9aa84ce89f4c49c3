/* Hard-disk probing: identity and size of block devices, the SMART
 * temperature through ATA ioctls and through smartctl, and where the disk
 * sits among /dev/sda .. /dev/sde.
 *
 * devName arguments are bare kernel names such as "sda"; the functions add
 * "/dev/" or "/sys/class/block/" themselves. Identity and SMART functions
 * print to standard output; vendor, bus, position and temperature probes log
 * at level 6 under the disk-probing module. */
#ifndef STBPLAT_DISK_H
#define STBPLAT_DISK_H

#include "stbplat/export.h"

#ifndef __cplusplus
#include <stdbool.h>
#endif

#ifdef __cplusplus
extern "C" {
#endif

/* Device nodes the probes know: deviceNode 0 .. 4 name /dev/sda .. /dev/sde. */
#define HARD_DRIVE_NODE_COUNT 5
/* HardDriveGetVendorType: 0 Seagate, 1 Western Digital, 2 Hitachi, 3 Toshiba,
 * 4 none. */
#define HARD_DRIVE_VENDOR_NONE 4
/* HardDriveNodeInfo.scsiBus when the disk's SCSI host is not known. */
#define HARD_DRIVE_BUS_UNKNOWN 0xFFFFFFFFu

/* Where the disk was found; filled by HardDriveProbeNodePosition. */
typedef struct HardDriveNodeInfo {
  /* Devices listed in /proc/scsi/scsi (disks, optical drives, card readers). */
  unsigned int scsiDeviceCount;
  /* N of the "hostN" in the disk's /sys/class/block link: the number that
   * SCSI_IOCTL_GET_BUS_NUMBER reports on its /dev/sgN; HARD_DRIVE_BUS_UNKNOWN
   * when the link names no host. */
  unsigned int scsiBus;
  /* 0 .. 4 for /dev/sda .. /dev/sde. */
  unsigned char deviceNode;
  unsigned char reserved[3];
} HardDriveNodeInfo;

/* Prints the model and serial number of /dev/<devName> (each cut at its
 * field's 40 and 20 characters). 0 when the device opened, else -1 (also for
 * a null or empty name, which would open /dev/ itself). A failed
 * identity request prints " ioctl HDIO_GET_IDENTITY successful ". */
STBPLAT_EXPORT int GetVendorInfo(char* devName);

/* Size of /dev/<devName> in bytes, or all bits set on failure. */
STBPLAT_EXPORT unsigned long GetBlkDevSize(const char* devName);

/* 1 when /sys/class/block/<devName> leads through an ATA controller, or
 * through USB to a device above 256 GiB (one whose size cannot be read
 * counts too); else 0. */
STBPLAT_EXPORT int IsDevHDD(const char* devName);

/* Diagnostic loop: prints the SMART temperature attribute of sda (or sdb)
 * every 10 seconds and never returns once the disk opened; -1 when no disk
 * is found or it does not open. */
STBPLAT_EXPORT int GetHDDTemperature(void);

/* 1 and the vendor index (0 .. 3) in *vendor when hdparm -i names a known
 * model, else 0 with *vendor = HARD_DRIVE_VENDOR_NONE. A null drive or
 * vendor gives 0 at once. */
STBPLAT_EXPORT int HardDriveGetVendorType(const HardDriveNodeInfo* drive, unsigned int* vendor);

/* 1 when one of /dev/sg0 .. /dev/sg4 is on SCSI bus `bus`; *found is then
 * `bus`, else 5. A null found gives 0 at once. */
STBPLAT_EXPORT int HardDriveProbeScsiBusPosition(unsigned int bus, unsigned int* found);

/* One reading from column `column` (0 .. 12) of smartctl's Temperature_Celsius
 * attribute line; column 12 holds "min/max)" and gives the max. 1 with the
 * reading (low 8 bits) in *value, else 0. A null drive gives 0. */
STBPLAT_EXPORT int HardDriveGetTemperatureData(const HardDriveNodeInfo* drive,
                                               unsigned char column, unsigned char* value);

/* pair[0] = current, pair[1] = highest temperature in degrees Celsius, read
 * with the columns the drive's vendor uses. A null drive or pair gives false. */
STBPLAT_EXPORT bool HardDriveGetTemperature(const HardDriveNodeInfo* drive, unsigned int* pair);

/* Finds the disk (HardDriveProbeNodePosition, so nothing is printed) and
 * returns its current temperature in *temperature (0 when the disk was found
 * but gave no reading). A null temperature gives false. */
STBPLAT_EXPORT bool GetHdTemperature(int* temperature);

/* Position probing. The probe prints nothing (IsDevHDD's texts are not
 * shown); it logs at level 6.
 *
 * HardDriveProbeNodePosition clears the record, then looks for the disk:
 * it counts the SCSI devices and scans the nodes. When that finds no ATA
 * disk while lsmod lists a USB storage driver but no SATA driver (libata,
 * ahci*, libahci, sata_*), the SATA driver may still be loading after USB
 * storage took the low letters: the probe waits 1 s and looks again, at most
 * 3 times (3 s in all). Otherwise it answers at once. 1 when a disk was
 * found; a USB disk found on the last look is kept. */
STBPLAT_EXPORT int HardDriveProbeNodePosition(HardDriveNodeInfo* drive);
/* Counts the devices in /proc/scsi/scsi into scsiDeviceCount; 1 when there
 * is at least one, 0 when there is none or the list cannot be read. */
STBPLAT_EXPORT int HardDriveProbeSataPosition(HardDriveNodeInfo* drive);
/* Looks at sda .. sde in order, counting only nodes that exist (a pulled
 * stick leaves a gap below the disk), until it has seen scsiDeviceCount of
 * them (all five when it is 0). The first ATA disk wins; failing that, the
 * first USB device IsDevHDD would take whose `hdparm -I` identity checksum
 * is correct (an empty card-reader slot has none). Records its node and
 * SCSI host; 1 when a disk was found. */
STBPLAT_EXPORT int HardDriveScanDeviceNode(HardDriveNodeInfo* drive);

#ifdef __cplusplus
}
#endif

#endif

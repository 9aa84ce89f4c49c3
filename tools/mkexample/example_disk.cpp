#include "example_disk.h"

namespace stbplat {
namespace example {

// A 1 TB Seagate disk on the SATA port, 36 degrees now, 49 at most.
std::map<std::string, std::string> DiskFiles() {
  return {
      {"dev/sda.ini",
       "; The hard disk on the SATA port.\n"
       "link = ../../devices/platform/rdb/f0458000.sata/ata1/host0/target0:0:0/0:0:0:0/block/sda\n"
       "size = 1000204886016\n"
       "model = ST1000DM010-2EP102\n"
       "serial = Z9A1EXMP\n"
       "bus = 0\n"},
      {"dev/sda.hdparm-i",
       "\n/dev/sda:\n\n"
       " Model=ST1000DM010-2EP102, FwRev=CC43, SerialNo=Z9A1EXMP\n"
       " Config={ HardSect NotMFM HdSw>15uSec Fixed DTR>10Mbs RotSpdTol>.5% }\n"
       " RawCHS=16383/16/63, TrkSize=0, SectSize=0, ECCbytes=4\n"},
      {"dev/sda.hdparm-I",
       "\n/dev/sda:\n\nATA device, with non-removable media\n"
       "\tModel Number:       ST1000DM010-2EP102\n"
       "\tSerial Number:      Z9A1EXMP\n"
       "Checksum: correct\n"},
      {"dev/sda.smartctl-A",
       "=== START OF READ SMART DATA SECTION ===\n"
       "SMART Attributes Data Structure revision number: 10\n"
       "Vendor Specific SMART Attributes with Thresholds:\n"
       "ID# ATTRIBUTE_NAME          FLAG     VALUE WORST THRESH TYPE      UPDATED  WHEN_FAILED RAW_VALUE\n"
       "  1 Raw_Read_Error_Rate     0x000f   117   099   006    Pre-fail  Always       -       120165720\n"
       "  9 Power_On_Hours          0x0032   091   091   000    Old_age   Always       -       8235\n"
       "194 Temperature_Celsius     0x0022   036   049   000    Old_age   Always       -       36 (Min/Max 18/49)\n"},
      {"proc/scsi/scsi",
       "Attached devices:\n"
       "Host: scsi0 Channel: 00 Id: 00 Lun: 00\n"
       "  Vendor: ATA      Model: ST1000DM010-2EP1 Rev: CC43\n"
       "  Type:   Direct-Access                    ANSI  SCSI revision: 05\n"},
      {"proc/modules",
       "sd_mod 53248 2 - Live 0x0000000000000000\n"
       "ahci_brcm 16384 1 - Live 0x0000000000000000\n"
       "libahci 36864 1 ahci_brcm, Live 0x0000000000000000\n"
       "libata 258048 2 ahci_brcm,libahci, Live 0x0000000000000000\n"},
  };
}

}  // namespace example
}  // namespace stbplat

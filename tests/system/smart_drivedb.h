/* Local smartctl drive database entry for the system tests' emulated disk.
 * qemu's ATA disk reports its temperature only as attribute 190; this preset
 * makes smartctl print it under the name the library greps for
 * (Temperature_Celsius), with the raw "N (Min/Max a/b)" columns of a real
 * drive. */
{ "stbplat system test disk",
  "ST1000DM003-1SB102",
  "",
  "",
  "-v 190,tempminmax,Temperature_Celsius"
},

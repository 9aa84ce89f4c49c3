// "AFPD": the text shown on the front-panel display, as one DATA entry.
// Constructed with flags 0, major 0, minor 0.
//
// The text is printed with "%s": producers store it with a terminating
// zero, the record adds none.
// Safe edges on corrupt input: Display stops at the payload's length even
// without a terminator, and shows a missing payload as "(null)".
#ifndef STBPLAT_FRONT_PANEL_H
#define STBPLAT_FRONT_PANEL_H

#include "stbplat/data_entry.h"
#include "stbplat/export.h"
#include "stbplat/system_descriptor.h"

class STBPLAT_EXPORT AnimatedFrontPanelDisplayEntry : public SystemDescriptor {
 public:
  DataEntry text;

  AnimatedFrontPanelDisplayEntry();
  ~AnimatedFrontPanelDisplayEntry() override;
  unsigned int Read(Extruder& in, unsigned int entrySize) override;
  unsigned int Store(Intruder* out) const override;
  // An indent prefix (clamped to 99 spaces), then the text, at log level 4.
  void Display(unsigned char indent) const;
};

#endif

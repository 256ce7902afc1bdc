/* SPDX-FileCopyrightText: 2026 The ImmunityRig developers */
/* SPDX-License-Identifier: MIT */

#ifndef PROC_H
#define PROC_H

#include <dsplink.h>
#include <procdefs.h>

#if defined(__cplusplus)
extern "C" {
#endif

DSP_STATUS PROC_setup(IN LINKCFG_Object* linkCfg);
DSP_STATUS PROC_destroy(void);
DSP_STATUS PROC_attach(IN ProcessorId procId, IN PROC_Attrs* attr);
DSP_STATUS PROC_detach(IN ProcessorId procId);
DSP_STATUS PROC_load(IN ProcessorId procId, IN Char8* imagePath, IN Uint32 argc, IN Char8** argv);
DSP_STATUS PROC_start(IN ProcessorId procId);
DSP_STATUS PROC_stop(IN ProcessorId procId);

#if defined(__cplusplus)
}
#endif

#endif

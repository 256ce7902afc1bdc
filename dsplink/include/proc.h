/* SPDX-FileCopyrightText: 2026 The ImmunityRig developers */
/* SPDX-License-Identifier: MIT */

/* Control of the DSP: set up the library, attach to the processor, load an image, start; then back. */
#ifndef PROC_H
#define PROC_H

#include "dsplink.h"
#include "procdefs.h"

#ifdef __cplusplus
extern "C" {
#endif

/* linkCfg null: the built-in configuration. DSP_SALREADYSETUP on every further call of the process. */
DSP_STATUS PROC_setup(LINKCFG_Object* linkCfg);

/* Needs PROC_setup; attr may be null. */
DSP_STATUS PROC_attach(ProcessorId procId, PROC_Attrs* attr);

/* imagePath: firmware file, DSP_EFILE if it cannot be read. argv is null when argc is 0. */
DSP_STATUS PROC_load(ProcessorId procId, Char8* imagePath, Uint32 argc, Char8** argv);

/* Needs a loaded image and an open pool. */
DSP_STATUS PROC_start(ProcessorId procId);

/* The last user's call gives DSP_SSTOPPED. */
DSP_STATUS PROC_stop(ProcessorId procId);

/* The last user's call gives DSP_SDETACHED. */
DSP_STATUS PROC_detach(ProcessorId procId);

#ifdef __cplusplus
}
#endif

#endif

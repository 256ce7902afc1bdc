/* SPDX-FileCopyrightText: 2026 The ImmunityRig developers */
/* SPDX-License-Identifier: MIT */

#ifndef PROCDEFS_H
#define PROCDEFS_H

#include <gpptypes.h>
#include <linkcfgdefs.h>

typedef struct PROC_Attrs_tag
{
    Uint32 timeout;
    LINKCFG_DspConfig* dspCfgPtr;
} PROC_Attrs;

#endif

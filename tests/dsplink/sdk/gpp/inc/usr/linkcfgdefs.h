/* SPDX-FileCopyrightText: 2026 The ImmunityRig developers */
/* SPDX-License-Identifier: MIT */

#ifndef LINKCFGDEFS_H
#define LINKCFGDEFS_H

#include <gpptypes.h>

typedef struct LINKCFG_DspConfig_tag
{
    Uint32 memEntries;
} LINKCFG_DspConfig;

typedef struct LINKCFG_Object_tag
{
    LINKCFG_DspConfig* dspConfigs[MAX_DSPS];
} LINKCFG_Object;

#endif

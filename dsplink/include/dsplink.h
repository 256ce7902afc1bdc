/* SPDX-FileCopyrightText: 2026 The ImmunityRig developers */
/* SPDX-License-Identifier: MIT */

/* What every user of the DSPLink interface includes first. */
#ifndef DSPLINK_H
#define DSPLINK_H

#include "constants.h"
#include "errbase.h"
#include "gpptypes.h"

/* The library's own configuration is built in: callers pass null. */
typedef struct LINKCFG_Object_tag LINKCFG_Object;

#endif

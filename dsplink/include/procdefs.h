/* SPDX-FileCopyrightText: 2026 The ImmunityRig developers */
/* SPDX-License-Identifier: MIT */

#ifndef PROCDEFS_H
#define PROCDEFS_H

/* Optional: callers pass null. */
typedef struct PROC_Attrs_tag PROC_Attrs;

#endif

/* SPDX-FileCopyrightText: 2026 The ImmunityRig developers */
/* SPDX-License-Identifier: MIT */

/* Basic types of the DSPLink interface. The maker's own header builds the 32-bit ones on "long", which fits the 32-bit
 * ARM only; fixed widths keep every structure that travels to the DSP the same size on a 64-bit development machine. */
#ifndef GPPTYPES_H
#define GPPTYPES_H

#include <assert.h>
#include <stddef.h>
#include <stdint.h>

typedef int8_t Int8;
typedef uint8_t Uint8;
typedef int16_t Int16;
typedef uint16_t Uint16;
typedef int32_t Int32;
typedef uint32_t Uint32;
typedef char Char8;
typedef unsigned char Uchar8;
typedef int Int;
typedef int16_t Bool;
typedef void* Pvoid;
typedef Char8* Pstr;

typedef Uint32 ProcessorId;
typedef Uint16 PoolId;

#define TRUE 1u
#define FALSE 0u

static_assert(sizeof(Bool) == 2, "the interface's truth value is a short integer");
static_assert(sizeof(Uint32) == 4 && sizeof(Int32) == 4, "words of the DSP have 32 bits");

#endif

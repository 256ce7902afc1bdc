/* SPDX-FileCopyrightText: 2026 The ImmunityRig developers */
/* SPDX-License-Identifier: MIT */

#ifndef GPPTYPES_H
#define GPPTYPES_H

typedef signed char Int8;
typedef unsigned char Uint8;
typedef signed short int Int16;
typedef unsigned short int Uint16;
typedef signed long int Int32;
typedef unsigned long int Uint32;
typedef char Char8;
typedef unsigned char Uchar8;
typedef int Int;
typedef short int Bool;
typedef void* Pvoid;
typedef Char8* Pstr;

typedef Uint32 ProcessorId;
typedef Uint16 PoolId;

#define IN
#define OUT

#undef NULL
#define NULL ((void*)0)
#define TRUE 1u
#define FALSE 0u

#endif

/* SPDX-License-Identifier: Apache-2.0
 * Vocabulary of the generated entry table, as assembler macros. Slot i holds the address of export i's wrapper; stub i
 * is 16 bytes whose only instruction jumps through slot i. Both follow the byte-wise order of the export names.
 */
#ifndef QORI_ENTRY_MACROS_H
#define QORI_ENTRY_MACROS_H

/* clang-format off */
#if defined(_WIN64)

/* The caller's convention is the wrapper's, whatever the arguments: a stub, being a leaf, needs no unwind data. */
.macro QORI_SLOT name, bytes
    .quad \name\()_impl
.endm
.macro QORI_STUB name, index
    .globl \name
    .def \name; .scl 2; .type 32; .endef
\name:
    jmp *(qoriEntryTable + 8 * \index)(%rip)
    .balign 16, 0x90
.endm

#elif defined(_WIN32)

/* stdcall: the wrapper's symbol carries the bytes of its arguments, so a wrong count in the registry fails to link. */
.macro QORI_SLOT name, bytes
    .long _\name\()_impl@\bytes
.endm
.macro QORI_STUB name, index
    .globl _\name
_\name:
    jmp *(qoriEntryTable + 4 * \index)
    .balign 16, 0x90
.endm

#else

.macro QORI_SLOT name, bytes
    .quad \name\()_impl
.endm
.macro QORI_STUB name, index
    .globl \name
    .type \name, @function
\name:
    jmp *(qoriEntryTable + 8 * \index)(%rip)
    .balign 16, 0x90
    .size \name, 16
.endm
.section .note.GNU-stack, "", @progbits

#endif
/* clang-format on */

#endif

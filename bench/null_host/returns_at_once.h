#ifndef BENCH_NULL_HOST_RETURNS_AT_ONCE_H
#define BENCH_NULL_HOST_RETURNS_AT_ONCE_H

/**
 * @file
 * RETURNS_AT_ONCE(name) implements a call of the host as nothing but a return.
 *
 * It returns zero, which is QEX_OK, a null pointer or nothing, and touches no output. All such
 * calls are one function under as many names; the assembler gives it these, because to the compiler
 * a function has one type.
 */

/** What all the names stand for; the widest result has the bits of all others. */
__attribute__((used)) static long return_at_once(void) {
  return 0;
}

#define RETURNS_AT_ONCE(name) \
  __asm__(".globl " #name "\n.type " #name ", @function\n.set " #name ", return_at_once");

#endif  // BENCH_NULL_HOST_RETURNS_AT_ONCE_H

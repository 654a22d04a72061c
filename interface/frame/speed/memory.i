// Memory for records, from the blocks that the allocator keeps at hand.
// Stands before everything that generates a wrapper.

%wrapper %{
/* Zero-filled memory for a record. The allocator keeps small blocks at hand, but not for calloc; the
 * compiler, which would make the two calls that one again, is kept from seeing that they belong
 * together. */
static inline void *allocate_zeroed(size_t size) {
  void *memory = malloc(size);
  __asm__("" : "+r"(memory), "+r"(size));
  return memory ? memset(memory, 0, size) : NULL;
}
#undef calloc
#define calloc(one, size) allocate_zeroed((one) * (size))
%}

// A tool that leaves walks by jumps of its own, and makes a call when it exits.

#include <setjmp.h>
#include <stdio.h>
#include <stdlib.h>

#include "nebpublic/state.h"
#include "vswitch/configuration.h"

static jmp_buf out;

static char leave(void *reached, void *context) {
  (void)reached;
  (void)context;
  longjmp(out, 1);
}

static char go_on(void *reached, void *context) {
  (void)reached;
  (void)context;
  return 1;
}

static void set_mtu(unsigned mtu) {
  printf("%d\n", (int)VSDVS_SetMTU("vswitch0", mtu));
  fflush(stdout);
}

static void exiting(void) {
  set_mtu(9000);
}

int main(void) {
  atexit(exiting);
  // The frame of each walk is where that of the one before was.
  for (volatile int left = 0; left < 3; ++left) {
    if (setjmp(out) == 0) {
      DVSState_SwitchForEach(leave, NULL);
    }
  }
  DVSState_SwitchForEach(go_on, NULL);
  set_mtu(1);
  return 0;
}

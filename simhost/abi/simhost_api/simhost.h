// What only a simulated host offers: libsimhost.so exports these, so that a program which finds one
// of them knows that the host it talks to is simulated. For C, C++ and foreign-function interfaces.
//
// A function with an int result returns QEX_OK, or the status that says why it did nothing; then
// simhost_error() says it in words. None of them springs the call trap. Texts are NUL-terminated
// UTF-8. Times are milliseconds.
#ifndef SIMHOST_CONTROL_SIMHOST_H
#define SIMHOST_CONTROL_SIMHOST_H

#include <stddef.h>
#include <stdint.h>

#ifdef __cplusplus
extern "C" {
#endif

/** The version of the simulated host: "major.minor.patch". Static text. */
char const *simhost_version(void);

/** Why the last function that this thread called failed, else empty; valid until the next. */
char const *simhost_error(void);

/* The host as a whole. */

/** Changes the host as a scenario document in JSON says: all of it, or nothing of it. */
int simhost_apply(char const *document);

/**
 * Describes the whole host as a document that simhost_apply reads.
 *
 * @param text receives as much as fits and a NUL; null if `size` is 0
 * @param size bytes at `text`
 * @return bytes of the whole document without its NUL; 0 if it failed
 */
size_t simhost_describe(char *text, size_t size);

/**
 * The file that holds the state of this process's host, absolute: the one that SIMHOST_STATE named
 * when the host was first used or asked for it, whatever it names by now.
 *
 * @param text receives as much as fits and a NUL, empty for a state in memory; null if `size` is 0
 * @param size bytes at `text`
 * @return bytes of the whole name without its NUL; 0 for a state in memory, and if it failed, which
 *         simhost_error() tells
 */
size_t simhost_state_file(char *text, size_t size);

/** Restarts the host: what is volatile, learned or counted goes, and switches not persistent. */
int simhost_restart(void);

/** Makes the host as it was when its state was new. */
int simhost_reset(void);

/* The host's clock: real time until one of these is called. */

/** What the clock shows, in milliseconds since the beginning of 1970; negative if it failed. */
int64_t simhost_clock_now(void);
int simhost_clock_stop(void);
int simhost_clock_run(void);
/** Moves the clock forward, whether or not it runs. */
int simhost_clock_step(int64_t milliseconds);
int simhost_clock_set(int64_t milliseconds);

/* What comes to a host from outside. */

/** Plugs the cable of an uplink in (1) or pulls it (0). */
int simhost_set_link(char const *uplink, int up);

/**
 * A frame from an address arrives.
 *
 * QEX_NOT_FOUND if the switch does not run, QEX_IS_DISABLED if the port does not learn,
 * QEX_LIMIT_EXCEEDED if there is no room, which is counted, and QEX_EXISTS if the address is fixed
 * elsewhere.
 *
 * @param switchName alias of the switch
 * @param port identifier of the port; null for the team of uplinks
 * @param mac six bytes in hexadecimal with colons between them
 * @param vni virtual network identifier, or 0
 */
int simhost_learn(char const *switchName, char const *port, char const *mac, uint16_t vlan,
                  uint32_t vni);

/**
 * Sets a counter.
 *
 * @param port identifier of the port that counts; null for the switch or a session
 * @param session identifier of the mirror session that counts; null for the switch or a port
 * @param name the field of the record in which callers see it, such as "txErrors"
 */
int simhost_set_counter(char const *switchName, char const *port, char const *session,
                        char const *name, uint64_t value);

/* The devices through which real frames come and go. What has one is no longer told what comes over
 * its wires: the functions above are QEX_NOT_SUPPORTED for it. */

/**
 * Gives a port a network device, in place of the one that it had.
 *
 * QEX_BUSY for a device that is somewhere else, QEX_INVALID_NAME for a name that none can have.
 *
 * @param device as Linux calls it
 * @param mac the address of its client, six bytes in hexadecimal; null if it is not known
 */
int simhost_connect(char const *switchName, char const *port, char const *device, char const *mac);
/** QEX_IS_DISCONNECTED for a port without a device. */
int simhost_disconnect(char const *switchName, char const *port);
/**
 * Tells what moves the frames, as an object in JSON: `change` is the number of the last change of
 * the host, `in_force` that of the last one that frames obey, null while no daemon says so, and
 * `said` what stands in the way. All are null while no daemon ever took the host: no frames move
 * then. Parameters and result as of simhost_describe.
 */
size_t simhost_plane(char *text, size_t size);
/**
 * Shares a switch of this host, with its ports, with the other hosts of its fabric.
 * QEX_NOT_SUPPORTED for a host that belongs to none, QEX_EXISTS for a switch that is shared,
 * QEX_BUSY where the fabric cannot be reached or refuses it, QEX_TIMEOUT where nobody knows what
 * became of it.
 */
int simhost_share(char const *switchName);
/**
 * Makes this host one of those that have a switch of its fabric. Returns when the switch is here;
 * it leaves when it is destroyed here. QEX_NOT_SUPPORTED and QEX_TIMEOUT as above, QEX_BUSY where
 * the fabric cannot be reached, has no such switch, or this host cannot bear it.
 */
int simhost_join(char const *switchName);
/**
 * Tells of the fabric that this host belongs to, as an object in JSON: `host` is its name there,
 * null if it belongs to none; `server` the one that is talked to, null without one; `revision` the
 * number of the last change of the fabric that is here; `trouble` what stands in the way.
 * Parameters and result as of simhost_describe.
 */
size_t simhost_fabric(char *text, size_t size);
/**
 * Tells what becomes of a frame that comes in at a port or an uplink of a switch, as an array in
 * JSON: of each step `does` is "passes", "delivered", "copied" or "dropped", `text` says it,
 * `setting` is null or the `port`, null for the switch's own, and `name` of the setting that
 * decided it, and what is delivered or copied has `to` and the `vlans` of its tags. Nothing is
 * sent. QEX_NOT_SUPPORTED while no frames move, QEX_IS_DISCONNECTED where there is no device,
 * QEX_BAD_PARAM for fewer bytes than a header has or more than a packet. Other parameters and
 * result as of simhost_describe.
 */
size_t simhost_trace(char const *switchName, char const *station, unsigned char const *frame,
                     size_t length, char *text, size_t size);

/* Faults: what is to happen to calls of a function. `nth` is the first call that is hit, 1 for the
 * next; `times` is how many are, 0 for all that follow. Panic and QEX_ReturnStatusToString cannot
 * be hit. */

/** The calls do nothing and return a status; QEX_NOT_SUPPORTED for a function that returns none. */
int simhost_fail_call(char const *function, uint32_t nth, uint32_t times, int status);

/** The calls do nothing and spring the trap with an exception type such as "OSError", and a text.
 */
int simhost_trap_call(char const *function, uint32_t nth, uint32_t times, char const *exception,
                      char const *message);

/**
 * The calls wait so many milliseconds of real time, then do what they do; QEX_BAD_PARAM for more
 * than an hour. A thread that holds the interpreter's lock gives it up while it waits, so that
 * other threads run. A signal handler of the interpreter's runs during the wait, if it is the main
 * thread that waits; what it raises is raised by the call, which then does nothing.
 */
int simhost_delay_call(char const *function, uint32_t nth, uint32_t times, uint32_t milliseconds);

/** Removes the faults of a function, or all for null; QEX_NOT_FOUND for no function of the host. */
int simhost_clear_faults(char const *function);

/* The ledger: memory and lists that the host allocated in this process. With SIMHOST_LEDGER=1 in
 * the environment, what is still out when the process ends is summed up on standard error. The size
 * of a list is what it takes with all that it holds, in whosever memory. */

/** How many blocks of memory and lists the host has allocated in this process and not released. */
size_t simhost_ledger_count(void);

/**
 * One line per block or list that is out, oldest first: "<address> <size> bytes from <call>".
 *
 * @param text receives as much as fits and a NUL; null if `size` is 0
 * @param size bytes at `text`
 * @return bytes of the whole report without its NUL
 */
size_t simhost_ledger_report(char *text, size_t size);

/**
 * One line per function and size, in the order of the names: "<count> x <size> bytes from <call>".
 * Parameters and result as above.
 */
size_t simhost_ledger_summary(char *text, size_t size);

#ifdef __cplusplus
}
#endif

#endif  // SIMHOST_CONTROL_SIMHOST_H

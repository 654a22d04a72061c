#ifndef QEXAPI_INTERRUPTS_H
#define QEXAPI_INTERRUPTS_H

/**
 * @file
 * How an interrupt is signalled.
 */

/** What triggers an interrupt. */
typedef enum qex_IntrTriggerType {
  QEX_INTR_TRIGGER_LEVEL = 0,
  QEX_INTR_TRIGGER_EDGE = 1,
} qex_IntrTriggerType;

/** Which level is active. */
typedef enum qex_IntrPolarityType {
  QEX_INTR_POLARITY_LOW = 0,
  QEX_INTR_POLARITY_HIGH = 1,
} qex_IntrPolarityType;

/** Trigger and polarity of an interrupt; the caller owns the record. */
typedef struct qex_IntrInfo {
  qex_IntrTriggerType trigger;
  qex_IntrPolarityType polarity;
} qex_IntrInfo;

#endif  // QEXAPI_INTERRUPTS_H

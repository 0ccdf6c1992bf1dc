/**
 * @file
 * @brief A chat service for tests of plug-ins: a test hands it what the plug-in sends, and takes
 * what the plug-in is to receive.
 *
 * The test carries the messages. The kit opens no connection, starts no thread, prints nothing,
 * reads no file and looks at no clock: its time is what the test says. A kit is used by one thread
 * at a time; several kits know nothing of each other. docs/testing.md shows how to use it, and has
 * the language of scenarios.
 *
 * Pointers may be NULL only where that is said. Without memory for a call, the kit does nothing
 * from then on, and reports that.
 *
 * A test lets the plug-in begin, then repeats, until nothing comes any more and the plug-in waits
 * for nothing:
 *
 *     if (qel_testkit_next(kit, &delivery)) {
 *       ... the plug-in receives it, and what it sends goes to qel_testkit_sent() ...
 *     } else {
 *       ... of delivery.after_ms and the plug-in's own timer, the one that ends sooner ...
 *       qel_testkit_wait(kit, sooner); ... and so much time passes for the plug-in ...
 *     }
 */
#ifndef QEL_TESTKIT_H
#define QEL_TESTKIT_H

#include <stdbool.h>
#include <stddef.h>
#include <stdint.h>

#ifdef __cplusplus
extern "C" {
#endif

/** A service, what it expects of the plug-in, and what went wrong so far. */
typedef struct qel_testkit qel_testkit_t;

/** What the plug-in is to receive. */
typedef struct qel_testkit_delivery {
  const char* message;       /**< which message it is, for example "ChatReply", or NULL */
  const unsigned char* data; /**< its bytes; like the name, valid until the next is taken */
  int size;                  /**< how many */
  int64_t after_ms;          /**< 0 with a message; otherwise after how many milliseconds one comes,
                                  or -1 if none does before the plug-in sends something */
} qel_testkit_delivery_t;

/**
 * A service that plays a scenario. What the scenario does not mention, the service answers.
 *
 * @param scenario  the scenario's text, which is copied; NULL for the service alone
 * @return a kit, to be released; NULL if there is no memory. If the text is no scenario,
 *         qel_testkit_report() says where, and the kit does nothing.
 */
qel_testkit_t* qel_testkit_new(const char* scenario);

/**
 * A service that repeats a recorded session: it expects the messages that were sent then, in the
 * same order, and delivers the bytes that were received then, at once. All fields are compared. Two
 * may differ: the requestId of a request, which the recorded replies to it come with then, and an
 * access token that the recorder has masked.
 *
 * @param session  the bytes of a session file, which are copied. Its end may be missing.
 * @param size     how many
 * @param ignored  names of fields that are not compared, wherever they stand in a message, with
 *                 blanks between them, for example "sentTime msgId"; NULL for none
 * @return as of qel_testkit_new()
 */
qel_testkit_t* qel_testkit_new_replay(const unsigned char* session, size_t size,
                                      const char* ignored);

/**
 * Releases the kit.
 *
 * @param kit  the kit; NULL is fine
 */
void qel_testkit_release(qel_testkit_t* kit);

/**
 * The plug-in has sent this.
 *
 * @param kit      the kit
 * @param message  which message it is, for example "ChatRequest"
 * @param data     its bytes, which are copied; may be NULL if the size is 0
 * @param size     how many
 */
void qel_testkit_sent(qel_testkit_t* kit, const char* message, const unsigned char* data, int size);

/**
 * Takes what the plug-in is to receive now.
 *
 * @param kit       the kit
 * @param delivery  receives it
 * @return whether there is something. If not, the delivery's after_ms says when to ask again.
 */
bool qel_testkit_next(qel_testkit_t* kit, qel_testkit_delivery_t* delivery);

/**
 * So much time has passed since the last call.
 *
 * @param kit           the kit
 * @param milliseconds  how much; negative numbers are taken as 0
 */
void qel_testkit_wait(qel_testkit_t* kit, int64_t milliseconds);

/**
 * The test is over: what is still expected counts as missing. What the plug-in sends afterwards is
 * ignored.
 *
 * @param kit  the kit
 * @return whether everything went as expected
 */
bool qel_testkit_end(qel_testkit_t* kit);

/**
 * What went wrong so far: a sentence in each line, "" if nothing. It never has an access token,
 * unless that is shorter than 8 bytes.
 *
 * @param kit  the kit
 * @return a text that is valid until the next call with the kit
 */
const char* qel_testkit_report(const qel_testkit_t* kit);

#ifdef __cplusplus
}
#endif

#endif

/*
 * session.h - the plug-in's end of one connection: what every exchange needs.
 *
 * Functions that return int return 0, or -1 after a line on standard error that says why.
 */
#ifndef EXAMPLES_SESSION_H
#define EXAMPLES_SESSION_H

#include "framing.h"
#include "qel-message-serialize.h"

/* Outputs are set to this before a call, to see whether the call wrote them. The service uses it
   neither as an id nor as a code. */
enum { NOT_WRITTEN = -4711 };

/* The service's codes: success, and two for success except for some of the users. */
enum { RESULT_OK = 0, RESULT_SOME_REFUSED = 1001, RESULT_SOME_NOT_INVITED = 3003 };

typedef struct {
  int socket;
  int64_t last_request_id;
  qel_message_inboxentry_t last_message; /* the last that was pushed; its chatMsg is ours */
} session_t;

int failed(const char* what);

/* Sends what a serializer handed out, and releases it. status is what the serializer returned. */
int send_message(session_t* session, const char* name, int status, unsigned char* message,
                 int size);

/* Waits for the message of that name, and takes the pushes that come before it. On success the
   caller releases frame->message. */
int await_message(session_t* session, const char* name, frame_t* frame);

/* Prints a reply's outcome, which should be the expected code. text may be NULL: it stays the
   caller's. */
int check_result(const session_t* session, const char* what, int64_t request_id, int code,
                 const char* text, int expected_code);

/* What a user sees of a message: its text, if it is a TEXT. A type that this library does not know
   reads as TEXT too, so nothing more is done with the text than to show it. */
const char* shown_text(const qel_message_inboxentry_t* message);

/* Takes a message that the service sends of its own accord. Fails if it is another message. */
int take_push(session_t* session, const frame_t* push);

#endif

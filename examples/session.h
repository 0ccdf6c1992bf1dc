/*
 * session.h - the plug-in's end of one connection: what every exchange needs.
 *
 * Functions that return int return 0, or -1 after a line on standard error that says why.
 */
#ifndef EXAMPLES_SESSION_H
#define EXAMPLES_SESSION_H

#include "framing.h"
#include "qel-message.h"

/* This service's code for success. With two others it lists the users whom it refused. */
enum { RESULT_OK = 0 };

/* Begins zeroed. */
typedef struct {
  int socket;
  int64_t last_request_id;
  qel_buffer_t message; /* the last that was written */
  frame_t received;     /* the last that came */
  qel_forward_online_message_get_t last_push;
} session_t;

void session_release(session_t* session);

int failed(const char* what);

/* Sends session->message, unless the status of the call that wrote it says that there is none. */
int send_message(session_t* session, const char* name, qel_status_t written);

/* Waits for the message of that name, and takes the pushes that come before it. Then it is in
   session->received. */
int await_message(session_t* session, const char* name);

/* The two in turn. */
int exchange(session_t* session, const char* request, qel_status_t written, const char* reply);

/* Prints a reply's outcome, which should be the expected code. */
int check_reply(const session_t* session, const char* what, qel_status_t read,
                const qel_reply_t* reply, int expected_code);

/* Reads what came as a reply that has nothing but its result, which should be a success. */
int take_result(const session_t* session, const char* what,
                qel_status_t (*read)(qel_reply_t* reply, const unsigned char* data, int size));

/* What a user sees of a message: its text, if it is a TEXT. A type that this library does not know
   reads as TEXT too, so a text with control characters is not shown. */
const char* shown_text(const qel_message_inboxentry_t* message);

/* Takes a message that the service sends of its own accord. Fails if it is another message. */
int take_push(session_t* session);

#endif

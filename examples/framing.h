/*
 * framing.h - how the example's two ends put messages on a TCP connection.
 *
 * The library hands out and takes bare messages. The caller has to tell where a message ends and
 * which one it is. In this example each message travels in a frame of
 *
 *   1 byte    length of the message's name
 *   n bytes   the name, as in the schema, for example "ChatRequest"
 *   4 bytes   length of the message, most significant byte first
 *   m bytes   the message
 */
#ifndef EXAMPLES_FRAMING_H
#define EXAMPLES_FRAMING_H

#ifdef __cplusplus
extern "C" {
#endif

enum {
  FRAME_NAME_SIZE = 64,         /* of a name with its terminating NUL */
  FRAME_MESSAGE_LIMIT = 1 << 20 /* in bytes; a longer message is refused */
};

typedef struct {
  char name[FRAME_NAME_SIZE];
  unsigned char* message; /* NULL or to be released with free() */
  int size;               /* of the message, in bytes */
} frame_t;

/* Makes every send and receive on the socket fail after so many seconds. Returns 0, or -1. */
int frame_set_timeout(int socket, int seconds);

/* Sends one message. Returns 0, or -1. */
int frame_send(int socket, const char* name, const unsigned char* message, int size);

/*
 * Receives one message. Returns 1, or 0 if the other end closed the connection between two frames,
 * or -1 if it closed it within a frame, sent no valid frame, or sent nothing in time.
 */
int frame_receive(int socket, frame_t* frame);

#ifdef __cplusplus
}
#endif

#endif

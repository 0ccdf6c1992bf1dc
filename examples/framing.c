#define _DEFAULT_SOURCE /* MSG_MORE */
#include "framing.h"

#include <errno.h>
#include <stdlib.h>
#include <string.h>
#include <sys/socket.h>
#include <sys/time.h>

int frame_set_timeout(int socket, int seconds) {
  struct timeval limit;
  limit.tv_sec = seconds;
  limit.tv_usec = 0;
  if (setsockopt(socket, SOL_SOCKET, SO_RCVTIMEO, &limit, sizeof limit) != 0) {
    return -1;
  }
  return setsockopt(socket, SOL_SOCKET, SO_SNDTIMEO, &limit, sizeof limit);
}

static int send_all(int socket, const void* bytes, size_t size, int flags) {
  const char* rest = bytes;
  while (size > 0) {
    ssize_t sent = send(socket, rest, size, MSG_NOSIGNAL | flags);
    if (sent < 0 && errno == EINTR) {
      continue;
    }
    if (sent <= 0) {
      return -1;
    }
    rest += sent;
    size -= (size_t)sent;
  }
  return 0;
}

/* Returns how many bytes came before the connection's end, or -1. */
static ssize_t receive_all(int socket, void* bytes, size_t size) {
  size_t received = 0;
  while (received < size) {
    ssize_t more = recv(socket, (char*)bytes + received, size - received, 0);
    if (more < 0 && errno == EINTR) {
      continue;
    }
    if (more < 0) {
      return -1;
    }
    if (more == 0) {
      break;
    }
    received += (size_t)more;
  }
  return (ssize_t)received;
}

static int receive_exactly(int socket, void* bytes, size_t size) {
  return receive_all(socket, bytes, size) == (ssize_t)size ? 0 : -1;
}

int frame_send(int socket, const char* name, const unsigned char* message, int size) {
  unsigned char head[1 + FRAME_NAME_SIZE + 4];
  size_t name_length = strlen(name);
  unsigned length = (unsigned)size;
  if (name_length >= FRAME_NAME_SIZE || size < 0 || size > FRAME_MESSAGE_LIMIT) {
    return -1;
  }
  head[0] = (unsigned char)name_length;
  memcpy(head + 1, name, name_length);
  head[1 + name_length] = (unsigned char)(length >> 24);
  head[2 + name_length] = (unsigned char)(length >> 16);
  head[3 + name_length] = (unsigned char)(length >> 8);
  head[4 + name_length] = (unsigned char)length;
  /* The head waits for the message, so that both travel in one segment. */
  if (send_all(socket, head, 5 + name_length, size > 0 ? MSG_MORE : 0) != 0) {
    return -1;
  }
  return send_all(socket, message, (size_t)size, 0);
}

int frame_receive(int socket, frame_t* frame) {
  unsigned char name_length = 0;
  unsigned char length[4];
  unsigned size;
  ssize_t first = receive_all(socket, &name_length, 1);

  memset(frame, 0, sizeof *frame);
  if (first <= 0) {
    return (int)first;
  }
  if (name_length >= FRAME_NAME_SIZE || receive_exactly(socket, frame->name, name_length) != 0 ||
      receive_exactly(socket, length, sizeof length) != 0) {
    return -1;
  }
  size =
      (unsigned)length[0] << 24 | (unsigned)length[1] << 16 | (unsigned)length[2] << 8 | length[3];
  if (size > FRAME_MESSAGE_LIMIT) {
    return -1;
  }
  frame->message = malloc(size > 0 ? size : 1);
  if (frame->message == NULL) {
    return -1;
  }
  if (receive_exactly(socket, frame->message, size) != 0) {
    free(frame->message);
    frame->message = NULL;
    return -1;
  }
  frame->size = (int)size;
  return 1;
}

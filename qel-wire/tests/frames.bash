# Frames of the example, and captures of packets that bring them.

hex() { od -An -v -tx1 | tr -d ' \n'; }

# frame NAME MESSAGE: the frame with that message, both as hex.
frame() { printf '%02x%s%08x%s' ${#1} "$(printf %s "$1" | hex)" $((${#2} / 2)) "$2"; }

# packets FILE PORTS: makes a capture of lines with a direction and bytes, a second for each.
packets() {
  # text2pcap reads no pipe.
  awk '{ at = NR - 1; printf "2026-11-23T%02d:%02d:%02dZ %s\n", 10 + at / 3600, at / 60 % 60, at % 60, $0 }' \
    >"$1.txt"
  TZ=UTC text2pcap -q -r '^(?<time>\S+) (?<dir>[<>]) (?<data>[0-9a-f]+)$' -t ISO \
    -4 10.0.0.2,10.0.0.1 -T "$2" "$1.txt" "$1"
}

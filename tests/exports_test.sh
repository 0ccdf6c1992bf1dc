#!/usr/bin/env bash
# exports_test.sh CASE SOURCE LIBRARY NM READELF: what the built library shows to other modules and
# wants from them. What the schema's classes are made of is read from the hand-written table of the
# schema, not from what the library is built from.
set -euo pipefail
export LC_ALL=C
source=$2
library=$3
nm=$4
readelf=$5
table=$source/tests/schema_table.txt

fail() {
  printf '%s\n' "$*" >&2
  exit 1
}

# exported [NM-OPTION...]: type and name of each symbol, without the address and a version.
exported() { "$nm" -D --defined-only "$@" "$library" | sed -E 's/^[0-9a-f]+ //; s/@.*//'; }

# C++ symbols in words; C's are plain identifiers.
exported_in_cxx() { exported -C | cut -c 3- | grep -vx '[A-Za-z0-9_]*' | sort; }

# What the compiler of the schema and the C++ compiler make of a message M; each constructor has two
# symbols, the destructor three.
of_each_message() {
  cat <<'TXT'
M::M()
M::M()
M::M(M const&)
M::M(M const&)
M::~M()
M::~M()
M::~M()
M::ByteSize() const
M::Clear()
M::CopyFrom(M const&)
M::CopyFrom(google::protobuf::Message const&)
M::GetCachedSize() const
M::GetMetadata() const
M::InitAsDefaultInstance()
M::IsInitialized() const
M::MergeFrom(M const&)
M::MergeFrom(google::protobuf::Message const&)
M::MergePartialFromCodedStream(google::protobuf::io::CodedInputStream*)
M::New() const
M::SerializeWithCachedSizes(google::protobuf::io::CodedOutputStream*) const
M::SerializeWithCachedSizesToArray(unsigned char*) const
M::SetCachedSize(int) const
M::SharedCtor()
M::SharedDtor()
M::Swap(M*)
M::default_instance()
M::default_instance_
M::descriptor()
typeinfo for M
typeinfo name for M
vtable for M
TXT
}

field_numbers() {
  awk -F '[: ,]+' '
    $1 == "enum" {exit}
    $1 == "message" {message = $2}
    {for (i = 1; i < NF; i++) if ($i ~ /^[0-9]+$/) {
       name = $(i + 1)
       print message "::k" toupper(substr(name, 1, 1)) substr(name, 2) "FieldNumber"}}' "$table"
}

messages() { sed -nE 's/^message ([^:]*):.*/\1/p' "$table"; }

schema() {
  local message step
  {
    for message in $(messages); do of_each_message | sed "s/\<M\>/$message/g"; done
    field_numbers
    sed -n 's/^enum \([^:]*\):.*/\1_IsValid(int)\n\1_descriptor()/p' "$table"
    for step in AddDesc AssignDesc ShutdownFile; do
      echo "protobuf_${step}_msgspec_5ffrontend_2eproto()"
    done
  } | sort
}

case $1 in
  c_interface_is_the_list)
    # As functions that every module can bind to.
    diff <(sed 's/^/T /' "$source/proto-lib/exported-functions.txt" | sort) \
      <(exported | grep -v '^. _Z' | sort) >&2
    ;;
  schema_is_exported_whole)
    exported=$(exported_in_cxx)
    missing=$(comm -23 <(schema) - <<<"$exported")
    [ -z "$missing" ] || fail "$missing"
    ;;
  nothing_but_the_schema_is_exported_in_cxx)
    # Further members of messages are inline ones, which no optimisation took away.
    exported=$(exported_in_cxx)
    more=$(comm -13 <(schema) - <<<"$exported" | grep -Ev "^($(messages | paste -sd '|'))::" || true)
    [ -z "$more" ] || fail "$more"
    ;;
  symbols_have_no_version)
    sections=$("$readelf" -SW "$library")
    ! grep -F '.gnu.version_d' <<<"$sections" >&2 || exit 1
    ;;
  only_the_schema_is_initialised)
    # The C runtime's own entry, and that of the generated code or of the one unit that it is part of.
    initialisers=$("$readelf" -sW "$library" |
      awk '$4 == "FUNC" && $8 ~ /^(frame_dummy|_GLOBAL__.*)$/ {print $8}' | sort)
    [[ $initialisers == _GLOBAL__sub_I_@(msgspec_frontend.pb|whole_library).cc$'\nframe_dummy' ]] ||
      fail "$initialisers"
    # Nor is there an entry by another name.
    size=$("$readelf" -SW "$library" | sed -nE 's/.* \.init_array +INIT_ARRAY +[^ ]+ [^ ]+ ([^ ]+) .*/\1/p')
    case $("$readelf" -h "$library") in *ELF64*) pointer=8 ;; *) pointer=4 ;; esac
    [ $((16#$size)) -eq $((2 * pointer)) ] || fail "0x$size bytes of initialisers"
    ;;
  own_functions_are_bound_when_linked)
    # The addresses that the loader has to look up are those of other libraries' functions.
    looked_up=$("$readelf" -rW "$library" | awk 'NF >= 5 {sub(/@.*/, "", $5); print $5}' | sort -u)
    own=$(exported | sed -n 's/^[TW] //p' | sort -u)
    again=$(comm -12 <(echo "$looked_up") <(echo "$own"))
    [ -z "$again" ] || fail "$(head -n 5 <<<"$again")"
    [ -n "$own" ] || fail 'no functions'
    ;;
  module_initialises_nothing)
    sections=$("$readelf" -SW "$library") # of its object file
    ! grep -E '\.(init_array|ctors)' <<<"$sections" >&2 || exit 1
    ;;
  only_known_libraries_are_needed)
    dynamic=$("$readelf" -dW "$library")
    more=$(sed -n 's/.*(NEEDED).*\[\(.*\)\]$/\1/p' <<<"$dynamic" |
      grep -Evx '(libprotobuf|libdlog(-standin)?|libstdc\+\+|libgcc_s|libm|libpthread|libc|ld-linux[-a-z0-9_]*)\.so(\.[0-9]+)*' || true)
    [ -z "$more" ] || fail "$more"
    grep -q 'NEEDED.*libprotobuf' <<<"$dynamic" || fail "the runtime is not needed: $dynamic"
    ;;
  *)
    fail "no such case: $1"
    ;;
esac

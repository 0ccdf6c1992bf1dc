#!/usr/bin/env bats
# What the built library shows to other modules and takes from them. What the schema's classes are
# made of is read from the hand-written table, not from what the library is built from.
load build

table=$SOURCE/tests/schema_table.txt

# exported [NM-OPTION...]: type and name of each symbol, without the address and a version.
exported() { "$NM" -D --defined-only "$@" "$LIBRARY" | sed -E 's/^[0-9a-f]+ //; s/@.*//'; }

# C++ symbols in words; C's are plain identifiers.
exported_in_cxx() { exported -C | cut -c 3- | grep -vx '[A-Za-z0-9_]*' | sort -u; }

messages() { sed -nE 's/^message ([^:]*):.*/\1/p' "$table"; }

# What the compiler of the schema and the C++ compiler make of each message, enumeration and file.
schema() {
  local message
  for message in $(messages); do
    sed "s/; */\n/g; s/\<M\>/$message/g" <<'TXT'
M::M(); M::M(M const&); M::~M(); M::ByteSize() const; M::Clear(); M::CopyFrom(M const&)
M::CopyFrom(google::protobuf::Message const&); M::GetCachedSize() const; M::GetMetadata() const
M::InitAsDefaultInstance(); M::IsInitialized() const; M::MergeFrom(M const&)
M::MergeFrom(google::protobuf::Message const&); M::New() const; M::SetCachedSize(int) const
M::MergePartialFromCodedStream(google::protobuf::io::CodedInputStream*)
M::SerializeWithCachedSizes(google::protobuf::io::CodedOutputStream*) const
M::SerializeWithCachedSizesToArray(unsigned char*) const; M::SharedCtor(); M::SharedDtor()
M::Swap(M*); M::default_instance(); M::default_instance_; M::descriptor()
typeinfo for M; typeinfo name for M; vtable for M
TXT
  done
  awk -F '[: ,]+' '
    $1 == "message" {message = $2}
    $1 == "enum" {message = ""; print $2 "_IsValid(int)\n" $2 "_descriptor()"}
    message {for (i = 1; i < NF; i++) if ($i ~ /^[0-9]+$/)
      print message "::k" toupper(substr($(i + 1), 1, 1)) substr($(i + 1), 2) "FieldNumber"}' "$table"
  printf 'protobuf_%s_msgspec_5ffrontend_2eproto()\n' AddDesc AssignDesc ShutdownFile
}

@test "the C interface is the list of functions, which every module can bind to" {
  diff <(functions | sed 's/^/T /' | sort) \
    <(exported | grep -v '^. _Z' | sort)
}

@test "the schema is exported whole" {
  comm -23 <(schema | sort) <(exported_in_cxx) | none
}

@test "nothing but the schema is exported in C++" {
  # Further members of messages are inline ones, which no optimisation took away.
  comm -13 <(schema | sort) <(exported_in_cxx) | grep -Ev "^($(messages | paste -sd '|'))::" | none
}

@test "symbols have no version" {
  sections=$("$READELF" -SW "$LIBRARY")
  grep -F '.gnu.version_d' <<<"$sections" | none
}

@test "only the schema is initialised when the library is loaded" {
  # By the C runtime's own entry, and that of the one unit that the generated code is part of.
  diff <(printf '%s\n' _GLOBAL__sub_I_whole_library.cc frame_dummy) \
    <("$READELF" -sW "$LIBRARY" | grep ' FUNC ' | grep -oE '\<(frame_dummy|_GLOBAL__.*)$' | sort)
  # Nor is there an entry by another name.
  local pointer=4 size
  [[ $("$READELF" -h "$LIBRARY") != *ELF64* ]] || pointer=8
  size=$("$READELF" -SW "$LIBRARY" | grep -oP ' \.init_array +INIT_ARRAY +\w+ \w+ \K\w+')
  [ $((16#$size)) -eq $((2 * pointer)) ] || fail "0x$size bytes of initialisers"
}

@test "the library's own functions are bound when it is linked" {
  # The addresses that the loader has to look up are those of other libraries' functions.
  exported | sed -n 's/^[TW] //p' | sort -u >own
  [ -s own ]
  "$READELF" -rW "$LIBRARY" | awk 'NF >= 5 {sub(/@.*/, "", $5); print $5}' | sort -u |
    comm -12 - own | none
}

@test "known libraries alone are needed, the runtime among them" {
  "$READELF" -dW "$LIBRARY" | sed -n 's/.*(NEEDED).*\[\(.*\)\]$/\1/p' >needed
  grep -q '^libprotobuf\.so' needed
  grep -Ev '^lib(protobuf|dlog(-standin)?|stdc\+\+|gcc_s|m|pthread|c)\.so|^ld-linux' needed | none
}

# Perl's regular expressions of the symbols that the library may take from others, those of C++ in
# words. The library uses no lock, file, socket, environment variable or setting: none is here, and
# what is added is to be looked at for that.
allowed=(
  # C library: memory, texts, the end of an assertion, the thread's number in log lines
  'calloc|malloc|free|memcpy|memset|strdup|strlen|__assert_fail|syscall'
  # log service, leak checker
  '__dlog_print|__lsan_ignore_object'
  # every shared object: its beginning and end, the check of its stacks
  '_ITM_(de)?registerTMCloneTable|__gmon_start__|__cxa_finalize|__stack_chk_(fail|guard)'
  # C++: blocks, exceptions, casts, text
  'operator (new|delete)(\[\])?\(.*\)|_Unwind_Resume|__aeabi_unwind_cpp_pr\d|__gxx_personality_v0'
  '__cxa_(begin_catch|end_catch|end_cleanup|rethrow|throw_bad_array_new_length)|__dynamic_cast'
  'vtable for __cxxabiv1::\w+|std::__cxx11::basic_string<char, .*|std::terminate\(\)'
  # Protocol Buffers, which has locks, files and settings too
  '((vtable|typeinfo) for )?google::protobuf::(io::Coded|Descriptor|GoogleOnce|Message|Unknown).*'
  '(vtable for )?google::protobuf::internal::(Function|Generated|InitEmpty|Log|OnShutdown).*'
  'google::protobuf::internal::(Reflection|Repeated|VerifyVersion|WireFormat|empty_string).*'
)

@test "nothing is taken from others but what is allowed" {
  "$NM" -D --undefined-only "$LIBRARY" | sed -E 's/^ *[Uw] //; s/@.*//' | c++filt >taken
  grep -qx malloc taken
  grep -vxP "$(IFS='|' && echo "${allowed[*]}")" taken | none
}

@test "no schema is built from elsewhere" {
  "$NM" -DC --undefined-only "$LIBRARY" >taken
  grep -q 'google::protobuf::DescriptorPool::InternalAddGeneratedFile(' taken # its own, compiled in
  grep -E '(BuildFile|DescriptorDatabase|DynamicMessage|FileDescriptorProto|compiler)' taken | none
}

@test "the runtime has no JSON" {
  "$NM" -DC --defined-only "$PROTOBUF/lib/libprotobuf.so.9" >names
  grep -q 'google::protobuf::Message::ParseFromArray\|google::protobuf::MessageLite::ParseFromArray' names
  grep -i json names | none
}

@test "the runtime is the one of C++" {
  "$READELF" -dW "$PROTOBUF/lib/libprotobuf.so.9" | sed -n 's/.*(NEEDED).*\[\(.*\)\]$/\1/p' >needed
  grep -q '^libstdc++\.so' needed
  grep -Ev '^lib(stdc\+\+|gcc_s|m|pthread|c)\.so|^ld-linux' needed | none
}

@test "the module has nothing that runs when it is loaded" {
  sections=$("$READELF" -SW "$MODULE")
  grep -E '\.(init_array|ctors)' <<<"$sections" | none
}

@test "the module has no data of its own that can be written" {
  # Neither global nor in functions or templates, nor their guards, nor a thread's own. The
  # runtime's headers have two pointers for ARM, and the compiler one for exceptions.
  "$NM" -C -f sysv --defined-only "$MODULE" >symbols
  grep -q '^client_echo_deserialize' symbols
  awk -F ' *[|] *' '$4 ~ /OBJECT|TLS/ && $7 !~ /^\.(rodata|data\.rel\.ro)/ {print $1 " in " $7}' \
    symbols | grep -Ev '^(google::protobuf::internal::pLinuxKernel|DW\.ref\.__gxx_)' | none
}

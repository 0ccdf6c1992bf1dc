#!/usr/bin/env bats
# What a release says of itself, and SECURITY.md, of whose table it is made.
# shellcheck disable=SC2016 # backticks of Markdown
load build

setup_file() {
  printf '%s 1.0-1\n' nlohmann-json3-dev libnettle8:amd64 doxygen-awesome-css >"$BATS_FILE_TMPDIR/tools.txt"
  echo archive >"$BATS_FILE_TMPDIR/qel-message-protosvc_1.2.3.orig.tar.gz"
  echo '/*! jQuery v3.6.0 */' >"$BATS_FILE_TMPDIR/jquery.js"
  "$SOURCE/packaging/documents.py" 1.2.3 1795300000 "$BATS_FILE_TMPDIR" "$BATS_FILE_TMPDIR/jquery.js"
}

# in_document FORM EXPRESSION: what a Python expression makes of the document d.
in_document() {
  python3 -c "import json, sys; d = json.load(open(sys.argv[1])); print($2)" \
    "$BATS_FILE_TMPDIR/qel-message-protosvc-1.2.3.$1.json"
}

@test "what is in a release names the runtime's source by its checksum" {
  archive=("$SOURCE"/.deps/protobuf2_*.orig.tar.gz)
  [ -e "${archive[0]}" ] || skip 'another runtime is used'
  read -r sum _ < <(sha256sum "${archive[0]}")
  for names in "spdx d['packages'] versionInfo d['checksums'][0]['checksumValue']" \
    "cdx d['components'] version d['hashes'][0]['content']"; do
    read -r form list version hash <<<"$names"
    [ "$(in_document "$form" "*((d['name'], d['$version'], ${hash}) for d in $list \
      if d['name'] == 'Protocol Buffers')")" = "('Protocol Buffers', '2.6.1', '$sum')" ]
  done
}

@test "every weakness that SECURITY.md names is in the OpenVEX document, with its status" {
  grep -oE 'CVE-[0-9]+-[0-9]+' "$SOURCE/SECURITY.md" | sort >named
  [ -s named ]
  in_document openvex "*(s['vulnerability']['name'] for s in d['statements']), sep='\n'" | sort | diff named -
  in_document openvex "*(f\"{s['vulnerability']['name']} {s.get('justification', s['status'])}\" \
    for s in d['statements']), sep='\n'" | sort | diff - <(
    sed -nE 's/^\| [0-9]+ \| ([^|]*CVE[^|]*)\| `([a-z_]+)` \|.*/\2 \1/p' "$SOURCE/SECURITY.md" |
      while read -r state text; do
        grep -oE 'CVE-[0-9]+-[0-9]+' <<<"$text" | sed "s/$/ $state/"
      done | sort)
}

@test "every test that SECURITY.md names is there" {
  ctest --test-dir "$BUILD" -N >tests
  grep -oP '`\K[A-Za-z]+\.[A-Za-z0-9_*]+(?=`)|[a-z]+\.bats`: \K[^|;]+(?= \|)|`\K[a-z]+\.bats(?=`)' \
    "$SOURCE/SECURITY.md" | grep -v '\.\*$\|\.md$\|\.cc$' | sort -u | while IFS= read -r name; do
    grep -qE "[ /]$name(/|\$)" tests || grep -rqF "@test \"$name\"" "$SOURCE/tests" || echo "$name"
  done | none
}

@test "make reads Buildroot's package" {
  sed 's/@VERSION@/1.2.3/' "$SOURCE/packaging/buildroot/qel-message-protosvc.mk" >package.mk
  cat >Makefile <<'E2'
BR2_DL_DIR = downloads
STAGING_DIR = staging
HOST_DIR = host
define cmake-package
$(eval all: ; @printf '%s\n' $(QEL_MESSAGE_PROTOSVC_SOURCE) $(QEL_MESSAGE_PROTOSVC_CONF_OPTS))
endef
include package.mk
E2
  run -0 make --warn-undefined-variables
  says 'qel-message-protosvc_1.2.3.orig.tar.gz -DBUILD_TESTING=OFF'
  [[ $output != *warning* ]]
}

@test "Kconfig reads Buildroot's option" {
  printf 'config %s\n\tdef_bool y\n' BR2_INSTALL_LIBSTDCPP BR2_TOOLCHAIN_HAS_THREADS >Kconfig
  printf 'config %s\n\tbool "%s"\n' BR2_STATIC_LIBS static BR2_PACKAGE_PROTOBUF protobuf \
    BR2_PACKAGE_DLOG dlog >>Kconfig
  echo "source \"$SOURCE/packaging/buildroot/Config.in\"" >>Kconfig
  run -0 /usr/bin/python3 -c 'import kconfiglib
k = kconfiglib.Kconfig("Kconfig")
k.syms["BR2_PACKAGE_QEL_MESSAGE_PROTOSVC"].set_value(2)
print(k.warnings, k.syms["BR2_PACKAGE_PROTOBUF"].str_value, k.syms["BR2_PACKAGE_DLOG"].str_value)'
  [ "$output" = '[] y y' ]
}

@test "the settings that recipes hand to CMake are the build's" {
  grep -ohE -- '-D[A-Z_]+' "$SOURCE"/packaging/{yocto,buildroot,rpm}/* "$SOURCE/packaging/configure.sh" |
    sed 's/-D//' | sort -u | grep -v '^CMAKE_\|^BUILD_TESTING$' | while read -r name; do
    grep -q "^$name:" "$BUILD/CMakeCache.txt" || echo "$name"
  done | none
}

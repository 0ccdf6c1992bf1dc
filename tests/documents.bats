#!/usr/bin/env bats
# What a release says of itself, and SECURITY.md, of whose table it is made.
# shellcheck disable=SC2016 # backticks of Markdown
load build

setup_file() {
  printf '%s 1.0-1\n' nlohmann-json3-dev libnettle8:amd64 libcli11-dev \
    libpcap0.8:amd64 libutf8proc2:amd64 doxygen-awesome-css >"$BATS_FILE_TMPDIR/tools.txt"
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
  for names in "spdx d['packages'] d['checksums'][0]['checksumValue']" \
    "cdx d['components'] d['hashes'][0]['content']"; do
    read -r form list hash <<<"$names"
    in_document "$form" "*((${hash}, d) for d in $list if d['name'] == 'Protocol Buffers')" >named
    grep "('$sum', .*'2[.]6[.]1'.*'pkg:github/protocolbuffers/protobuf@v2[.]6[.]1'" named
    grep "'cpe:2[.]3:a:google:protobuf:2[.]6[.]1:" named
  done
}

@test "what is in two packages is one component of a release" {
  in_document cdx "*(c['bom-ref'] for c in d['components']), sep='\n'" | sort | uniq -d | none
  in_document cdx "*(c['ref'] for c in d['dependencies'] if 'CLI11' in c['dependsOn'])" |
    diff - <(echo qel-message-testkit qel-wire)
}

@test "Debian's changelog tells a release from what comes before and after it" {
  mkdir -p packaging/debian
  cp "$SOURCE/packaging/debian_changelog.py" packaging
  cp "$SOURCE/packaging/debian/control" packaging/debian
  while read -r version entry expected; do
    printf '%s\n' "  VERSION $version" >CMakeLists.txt
    printf '%s\n' '## [Unreleased]' "$entry new" '## [1.2.0] - 2030-01-02' '- `first`' >CHANGELOG.md
    [ "$(packaging/debian_changelog.py 1900000000 | dpkg-parsechangelog -l - -S Version)" = "$expected" ]
  done <<<$'1.2.0 not 1.2.0-1\n1.2.0 - 1.2.0+203003171746-1\n2.0.0 - 2.0.0~203003171746-1'
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
BR2_PACKAGE_QEL_MESSAGE_PROTOSVC_TRACE = y
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
    BR2_PACKAGE_DLOG dlog BR2_TOOLCHAIN_USES_GLIBC glibc >>Kconfig
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

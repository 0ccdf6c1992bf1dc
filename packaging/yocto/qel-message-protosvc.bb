# For Yocto 4.0 to 5.0. Check the archive by the release's SHA256SUMS: files of a layer are not checked.
SUMMARY = "Wire protocol between a chat client's plug-in and the chat service"
# The owner has granted no licence yet.
LICENSE = "CLOSED"

SRC_URI = "file://qel-message-protosvc_${PV}.orig.tar.gz"
S = "${WORKDIR}/qel-message-protosvc-${PV}"

DEPENDS = "protobuf protobuf-native dlog python3-pyyaml-native python3-jsonschema-native"
inherit cmake python3native

EXTRA_OECMAKE = " \
    -DBUILD_TESTING=OFF \
    -DQEL_TOOLS=OFF \
    -DQEL_PROTOBUF_ROOT=${STAGING_DIR_HOST}${prefix} \
    -DQEL_PROTOC=${STAGING_BINDIR_NATIVE}/protoc \
    -DQEL_DLOG_LIBRARY=${STAGING_LIBDIR}/libdlog.so \
    -DQEL_PYTHON=${PYTHON} \
"

# Programs on devices name the library without its number, or open it by that name.
FILES_SOLIBSDEV = ""
FILES:${PN} += "${libdir}/libqel-message-protosvc.so"
INSANE_SKIP:${PN} += "dev-so"
PACKAGES =+ "${PN}-trace"
FILES:${PN}-trace = "${libdir}/libqel-trace.so"
INSANE_SKIP:${PN}-trace += "dev-so"
FILES:${PN}-dev += "${datadir}/qel-message-protosvc"

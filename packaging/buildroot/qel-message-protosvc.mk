################################################################################
#
# qel-message-protosvc
#
################################################################################

QEL_MESSAGE_PROTOSVC_VERSION = @VERSION@
QEL_MESSAGE_PROTOSVC_SOURCE = qel-message-protosvc_$(QEL_MESSAGE_PROTOSVC_VERSION).orig.tar.gz
# The archive is in BR2_DL_DIR already.
QEL_MESSAGE_PROTOSVC_SITE = $(BR2_DL_DIR)/qel-message-protosvc
QEL_MESSAGE_PROTOSVC_SITE_METHOD = file
# The owner has granted no licence yet.
QEL_MESSAGE_PROTOSVC_LICENSE = none yet
QEL_MESSAGE_PROTOSVC_LICENSE_FILES = packaging/debian/copyright
QEL_MESSAGE_PROTOSVC_REDISTRIBUTE = NO
QEL_MESSAGE_PROTOSVC_INSTALL_STAGING = YES
QEL_MESSAGE_PROTOSVC_DEPENDENCIES = protobuf host-protobuf dlog host-python3 host-python-pyyaml \
	host-python-jsonschema
QEL_MESSAGE_PROTOSVC_CONF_OPTS = \
	-DBUILD_TESTING=OFF \
	-DQEL_TOOLS=OFF \
	-DQEL_TRACE=$(if $(BR2_PACKAGE_QEL_MESSAGE_PROTOSVC_TRACE),ON,OFF) \
	-DQEL_PROTOBUF_ROOT=$(STAGING_DIR)/usr \
	-DQEL_PROTOC=$(HOST_DIR)/bin/protoc \
	-DQEL_DLOG_LIBRARY=$(STAGING_DIR)/usr/lib/libdlog.so \
	-DQEL_PYTHON=$(HOST_DIR)/bin/python3

$(eval $(cmake-package))

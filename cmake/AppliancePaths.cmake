# Every fixed path of the appliance is FILEINDEX_ROOT followed by its appliance location. They are
# written here, once, into one generated header (appliance_paths.h) that the library, the emulated
# platform, the tools and the tests include; nothing else spells them.
set(FILEINDEX_GENERATED_DIR ${CMAKE_BINARY_DIR}/generated)

string(REGEX REPLACE "/+$" "" FILEINDEX_ROOT_CLEAN "${FILEINDEX_ROOT}")
if(NOT FILEINDEX_ROOT_CLEAN STREQUAL "" AND NOT FILEINDEX_ROOT_CLEAN MATCHES "^/")
  message(FATAL_ERROR "FILEINDEX_ROOT must be an absolute path, got '${FILEINDEX_ROOT}'")
endif()

set(FILEINDEX_FOLDER_CONF_PATH "${FILEINDEX_ROOT_CLEAN}/usr/vexo/etc/fileindex/folder.conf")
set(FILEINDEX_STATUS_CONF_PATH "${FILEINDEX_ROOT_CLEAN}/usr/vexo/etc/fileindex/status.conf")
set(FILEINDEX_FOLDER_LOCK_PATH "${FILEINDEX_ROOT_CLEAN}/tmp/fileidx_cfg_folder.lock")
set(FILEINDEX_STATUS_LOCK_PATH "${FILEINDEX_ROOT_CLEAN}/tmp/fileidx_cfg_status.lock")
set(FILEINDEX_DAEMON_SOCKET_PATH "${FILEINDEX_ROOT_CLEAN}/var/run/fileindexd.sock")
set(FILEINDEX_NOTIFY_TOOL_PATH "${FILEINDEX_ROOT_CLEAN}/usr/vexo/bin/vexohvxnotify")
set(FILEINDEX_PANEL_TOKEN_PATH "${FILEINDEX_ROOT_CLEAN}/usr/vexo/etc/fileindex/panel.token")
set(FILEINDEX_EMULATION_STATE_DIR "${FILEINDEX_ROOT_CLEAN}/emulation")

string(LENGTH "${FILEINDEX_DAEMON_SOCKET_PATH}" _socket_length)
# sun_path holds 108 bytes, the terminating NUL included.
if(_socket_length GREATER 107)
  message(FATAL_ERROR
    "FILEINDEX_ROOT '${FILEINDEX_ROOT_CLEAN}' makes the daemon socket path ${_socket_length} bytes long; "
    "a Unix socket address holds at most 107. Choose a shorter FILEINDEX_ROOT.")
endif()

configure_file(${CMAKE_CURRENT_LIST_DIR}/appliance_paths.h.in ${FILEINDEX_GENERATED_DIR}/appliance_paths.h @ONLY)

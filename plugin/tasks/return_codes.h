/// The result of a command: the code that the server gets as RETVAL, and the message identifier
/// that belongs to it. The texts of the messages are the server's.
#pragma once

/// The values are part of the protocol.
enum TASK_RC : int {
    TASK_OK = 0,
    TASK_NO_COMMAND = 1001,
    TASK_NO_TRANSID = 1002,
    TASK_NO_PRODUCT = 1003,
    TASK_NO_CONTEXT = 1004,
    TASK_NO_TARGETMSN = 1005,
    TASK_NOT_SUPPORTED = 1006,
    TASK_NO_TRANSLATOR = 1007,
    TASK_TRANSLATOR_FAILED = 1008,
    TASK_TRANSLATOR_NOT_STARTED = 1009,
    TASK_NO_DEPOT = 1010,
    TASK_NO_META_PATH = 1011,
    TASK_NO_WORK_PATH = 1012,
    TASK_NO_RB_PATH = 1013,
    TASK_METAFILE_NOT_COPIED = 1014,
    TASK_SCRIPT_NOT_COPIED = 1015,
    TASK_IMPORT_FAILED = 1016,
    TASK_DELETE_NOT_STARTED = 1017,
    TASK_IMPORT_NOT_STARTED = 1018,
    TASK_NOT_INSTALLED = 1019,
    TASK_NO_CONFIG_FILE = 1020,
    TASK_BAD_WORK_PATH = 1021,
    TASK_GETDPTYPE_NOT_STARTED = 1022,
    TASK_NO_DPTYPE = 1023,
    TASK_START_STOP_FAILED = 1024,
    TASK_START_STOP_NOT_STARTED = 1025,
    TASK_INSTANCE_NOT_STARTED = 1026,
    TASK_INSTANCE_NOT_STOPPED = 1027,
    TASK_STARTUP_PARMS_NOT_CHANGED = 1028,
    TASK_NO_VERSION = 1029,
    TASK_INSTALL_NOT_STARTED = 1030,
    TASK_INSTALL_FAILED = 1031,
    TASK_UNINSTALL_FAILED = 1032,
    TASK_UNINSTALL_NOT_STARTED = 1033,
    TASK_NO_ARCHITECTURE = 1034,
    TASK_INFORMATION = 1035,  ///< not used by this library
};

/// The message identifiers. Entry 0 is empty; entry n belongs to code 1000 + n.
extern const char* const rc2MsgId[36];

/// The text for RETMSGID, which is constant and empty for success. `rc` must be a value of the
/// enumeration; this is not checked.
const char* rcToMsgId(TASK_RC rc);

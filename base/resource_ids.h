// Resource numbers of the module. Shared by the .rc files and the C++ code; plain
// #defines because windres reads this file too.
#pragma once

// Icon groups
#define IDI_NAMESPACE          100
#define IDI_LEVEL              101
#define IDI_ADD_LEVEL          102
#define IDI_VIRTUAL_FILE       104
// Clip played while a view enumerates
#define IDR_ENUM_CLIP          103
// Accelerator table of the view
#define IDR_VIEW_ACCELERATORS  300
// Type library
#define IDR_TYPELIB            1
// Registration scripts (resource type "REGISTRY")
#define IDR_REG_DATAOBJECT         2
#define IDR_REG_ENUMIDLIST         3
#define IDR_REG_EXTRACTICON        4
#define IDR_REG_QUERYINFO          5
#define IDR_REG_SHELLFOLDER        6
#define IDR_REG_SHELLVIEW          7
#define IDR_REG_DROPTARGET         8
#define IDR_REG_DROPTARGETONLIST   9

// Dialog templates
#define IDD_STATION_GENERAL    201
#define IDD_STATION_ADVANCED   202
#define IDD_DOWNLOAD           213
#define IDD_UPLOAD             216

// Controls of the level property pages
#define IDC_STATION_NAME       203
#define IDC_STATION_NOTE       204
#define IDC_STATION_PORT       205
#define IDC_STATION_MODEL      206
#define IDC_STATION_BAUD       208
#define IDC_STATION_PARITY     209
#define IDC_STATION_DATABITS   210
#define IDC_STATION_STOPBITS   211
#define IDC_STATION_FLOW       218
#define IDC_STATION_CHECKSUM   219
#define IDC_LABEL_NAME         310
#define IDC_LABEL_NOTE         311
#define IDC_LABEL_PORT         312
#define IDC_LABEL_MODEL        313
#define IDC_LABEL_BAUD         314
#define IDC_LABEL_PARITY       315
#define IDC_LABEL_DATABITS     316
#define IDC_LABEL_STOPBITS     317
#define IDC_LABEL_FLOW         321
#define IDC_LABEL_CHECKSUM     322

// Controls of the transfer dialogs
#define IDC_TRANSFER_INSTRUCTIONS  214
#define IDC_TRANSFER_STATUS        215
#define IDC_TRANSFER_NAME          217
#define IDC_TRANSFER_START         220
#define IDC_TRANSFER_STATUS_LABEL  319
#define IDC_TRANSFER_NAME_LABEL    320

// Strings
#define IDS_SIZE_BYTES            270
#define IDS_SIZE_KB               271
#define IDS_SIZE_MB               272
#define IDS_SIZE_GB               273
#define IDS_LABEL_NAME            350
#define IDS_LABEL_NOTE            351
#define IDS_LABEL_PORT            352
#define IDS_LABEL_MODEL           353
#define IDS_LABEL_BAUDRATE        354
#define IDS_LABEL_PARITY          355
#define IDS_LABEL_DATABITS        356
#define IDS_LABEL_STOPBITS        357
#define IDS_LABEL_TKF_FORMAT      358
#define IDS_LABEL_STATUS          359
#define IDS_LABEL_FILE_NAME       360
#define IDS_TAB_GENERAL           361
#define IDS_TAB_ADVANCED          362
#define IDS_LABEL_FLOW            363
#define IDS_LABEL_CHECKSUM        364
#define IDS_ADD_NEW_LEVEL         1000
#define IDS_ROOT_NAME             1001
#define IDS_CREATE_LEVEL          1002
#define IDS_DELETE                1003
#define IDS_PROPERTIES            1004
#define IDS_LARGE_ICONS           1005
#define IDS_SMALL_ICONS           1006
#define IDS_LIST                  1007
#define IDS_DETAILS               1008
#define IDS_COLUMN_NAME           1009
#define IDS_COPY                  1010
#define IDS_PASTE                 1011
#define IDS_FINISHING_DOWNLOAD    1012
#define IDS_WAITING_FOR_START     1013
#define IDS_TRANSFER_PERCENT      1014
#define IDS_PARITY_NONE           1015
#define IDS_PARITY_ODD            1016
#define IDS_PARITY_EVEN           1017
#define IDS_COPY_OF               1018
#define IDS_NEW_LEVEL_NAME        1022
#define IDS_LEVEL_EXISTS          1023
#define IDS_NAME_BAD_CHARS        1024
#define IDS_NAME_EMPTY            1025
#define IDS_LEVEL_PROPERTIES      1026
#define IDS_DOWNLOADING           1027
#define IDS_SELECT                1028
#define IDS_OPEN                  1029
#define IDS_START                 1030
#define IDS_CANCEL                1031
#define IDS_UNKNOWN_FORMAT        1032
#define IDS_TKF20                 1033
#define IDS_TKF33                 1034
#define IDS_FLOW_NONE             1036
#define IDS_FLOW_XONXOFF          1037
#define IDS_CHECKSUM_NOT_SET      1038
#define IDS_CHECKSUM_SET          1039
#define IDS_TERMINATING           1040
#define IDS_ERR_TEMP_FILE_OPEN    1041
#define IDS_ERR_POINT_NAME        1042
#define IDS_UPLOADING             1043
#define IDS_ERR_CREATE_FILE       1044
#define IDS_ERR_CHECKSUM          1045
#define IDS_NO_ERROR              1046
#define IDS_MODEL_HRA20           1047
#define IDS_MODEL_HRA40           1048
#define IDS_MODEL_HRB1X           1049
#define IDS_INSTRUCTIONS_HRA20    1050
#define IDS_INSTRUCTIONS_HRA40    1051
#define IDS_INSTRUCTIONS_HRB1X    1052
#define IDS_WAITING_FOR_DOWNLOAD  1053
#define IDS_ERR_TIMEOUT           1103
#define IDS_ERR_INTERRUPTED       1104
#define IDS_ERR_TOO_BIG           1105
#define IDS_DOWNLOAD_TITLE        1106
#define IDS_INSTRUCTIONS_PREFIX   1108
#define IDS_ERR_SET_FILE_PATH     1109
#define IDS_ERR_SET_TIMEOUT       1110
#define IDS_ERR_SET_POINTS        1111
#define IDS_ERR_SET_COMM_PARAMS   1112
#define IDS_ERR_RECEIVE_FILE      1113
#define IDS_ERR_UNKNOWN           1114
#define IDS_ERR_PORT_BUSY         2010
#define IDS_ERROR_FALLBACK        4041

// Resource identifiers of the module. The numbers are fixed: other programs and the registry
// (DefaultIcon "%MODULE%,0") refer to them.
#pragma once

// Strings
#define IDS_CANCEL                 2
#define IDS_GENERAL                270
#define IDS_SIZE_KB                271
#define IDS_SIZE_MB                272
#define IDS_SIZE_GB                273
#define IDS_CALVEX_RECEIVERS       1001
#define IDS_COLUMN_NAME            1005
#define IDS_COLUMN_SIZE            1006
#define IDS_COLUMN_SERIAL          1007
#define IDS_COLUMN_MODEL           1008
#define IDS_COLUMN_PORT            1009
#define IDS_MENU_COPY              1032
#define IDS_COLUMN_TIME            1034
#define IDS_FILE_DOWNLOAD          1035
#define IDS_SIZE_BYTES             1036
#define IDS_DOWNLOADING            1045
#define IDS_MENU_LARGE_ICONS       1047
#define IDS_MENU_SMALL_ICONS       1048
#define IDS_MENU_LIST              1049
#define IDS_MENU_DETAILS           1050
#define IDS_PROPERTIES             1053
#define IDS_MENU_DELETE            1054
#define IDS_DETECTING              1060
#define IDS_PORT_USB               1062
#define IDS_PORT_UNKNOWN           1063
#define IDS_WAITING_FOR_CANCEL     1064
#define IDS_BRENNOR_RECEIVERS      1065
#define IDS_MENU_REFRESH           1120
#define IDS_MENU_SELECT            1121
#define IDS_MENU_OPEN              1122
#define IDS_INVALID_DATETIME       55296   // deliberately not in the string table

// Icons: the first two are the brand folders' DefaultIcon indexes 0 and 1.
#define IDI_CALVEX                 101
#define IDI_BRENNOR                102
#define IDI_NOITEM                 103
#define IDI_FILE                   104
#define IDI_MODULE                 106

// Download progress dialog
#define IDD_PROGRESS               210
#define IDC_PROGRESS_STATUS        211
#define IDC_PROGRESS_BAR           212

// Searching dialog
#define IDD_FIND                   250
#define IDC_FIND_TEXT              251
#define IDC_FIND_ANIMATION         252
#define IDC_FIND_STATIC            523
#define IDR_FIND_AVI               252

// Receiver properties page
#define IDD_RECEIVER_PROPERTIES    260
#define IDC_PROP_RECEIVER          261
#define IDC_PROP_MODEL             262
#define IDC_PROP_SERIAL            263
#define IDC_PROP_PORT              264
#define IDC_PROP_LABEL_RECEIVER    1015
#define IDC_PROP_LABEL_MODEL       1016
#define IDC_PROP_LABEL_SERIAL      1017
#define IDC_PROP_LABEL_PORT        1018

// Registry scripts, one per class of the class table
#define IDR_CONTEXTMENU            1
#define IDR_DATAOBJECT             2
#define IDR_ENUMIDLIST             3
#define IDR_EXTRACTICON            4
#define IDR_QUERYINFO              5
#define IDR_CALVEX_FOLDER          6
#define IDR_SHELLVIEW              7
#define IDR_BRENNOR_FOLDER         8

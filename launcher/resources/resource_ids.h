// Numbers of the executable's string table and resources. Shared by the resource script and the code.
#ifndef LAUNCHER_RESOURCES_RESOURCE_IDS_H
#define LAUNCHER_RESOURCES_RESOURCE_IDS_H

#define IDS_VM_LIBRARY_NOT_LOADED 4
#define IDS_MAIN_CLASS_NOT_CALLED 5
#define IDS_VM_NOT_CREATED 6
#define IDS_CAPTION 7

#define IDI_LAUNCHER 1

#endif

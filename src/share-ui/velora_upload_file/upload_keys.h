#pragma once
// Up and Down in the list of uploads. Main loop only.
#include "velora_upload_file/upload_record.h"

// Lets Up and Down go from one upload that something can be done with to the next.
void __list_keys_add(Evas_Object *genlist);

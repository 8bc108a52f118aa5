#include "velora_common/velora_genlist.h"
#include "velora_common/velora_log.h"
#include <vector>

void remove_genlist_item(Evas_Object *genlist)
{
    if (!genlist) {
        VELORA_LOGE("list is NULL");
        return;
    }
    // A list that has the keys' focus hands it on to the next of its rows with each one deleted.
    if (elm_object_focus_get(genlist))
        elm_object_focus_set(genlist, EINA_FALSE);
    std::vector<Elm_Object_Item *> items; // collected first: deletion must not walk a list that changes
    for (Elm_Object_Item *item = elm_genlist_first_item_get(genlist); item; item = elm_genlist_item_next_get(item))
        items.push_back(item);
    for (Elm_Object_Item *item : items)
        elm_object_item_del(item);
}

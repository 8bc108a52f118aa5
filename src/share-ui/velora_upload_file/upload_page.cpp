#include "velora_upload_file/upload_page.h"
#include "velora_common/velora_paths.h"
#include "velora_upload_file/upload_text.h"

static const char s_title[] = "IDS_KQ_HEADER_UPLOAD_TO_ABB2";

Evas_Object *__page_of(UploadViewData *vd)
{
    return elm_object_parent_widget_get(vd->layout);
}

void __title_set(UploadViewData *vd, const char *id)
{
    elm_object_item_domain_translatable_part_text_set(vd->nf_item, "elm.text.title", VELORA_SHARE_DOMAIN, id);
    ea_screen_reader_name_set(__page_of(vd), __text(id));
}

void __title_set_words(UploadViewData *vd, const char *words)
{
    elm_object_item_part_text_set(vd->nf_item, "elm.text.title", words);
    ea_screen_reader_name_set(__page_of(vd), words);
}

static Evas_Object *__button_create(UploadViewData *vd, const char *style, const char *id, const char *part,
                                    Evas_Smart_Cb cb)
{
    Evas_Object *button = elm_button_add(vd->ad->naviframe);
    elm_object_style_set(button, style);
    elm_object_domain_translatable_text_set(button, VELORA_SHARE_DOMAIN, id);
    evas_object_smart_callback_add(button, "clicked", cb, vd);
    elm_object_item_part_content_set(vd->nf_item, part, button);
    return button;
}

void __title_buttons_create(UploadViewData *vd, Evas_Smart_Cb cancel, Evas_Smart_Cb done)
{
    __title_buttons_delete(vd);
    vd->cancel_btn = __button_create(vd, "naviframe/title_text_left", "IDS_TPLATFORM_ACBUTTON_CANCEL_ABB",
                                     "title_left_text_btn", cancel);
    vd->done_btn = __button_create(vd, "naviframe/title_text_right", "IDS_TPLATFORM_ACBUTTON_DONE_ABB",
                                   "title_right_text_btn", done);
}

void __title_buttons_delete(UploadViewData *vd)
{
    for (Evas_Object **button : {&vd->done_btn, &vd->cancel_btn}) {
        if (*button)
            evas_object_del(*button);
        *button = nullptr;
    }
}

void __more_button_create(UploadViewData *vd, Evas_Smart_Cb more)
{
    if (!vd->more_btn)
        vd->more_btn =
            __button_create(vd, "naviframe/more/default", "IDS_VELORA_BODY_MORE_OPTIONS", "toolbar_more_btn", more);
}

void __more_button_delete(UploadViewData *vd)
{
    if (!vd->more_btn)
        return;
    elm_object_item_part_content_unset(vd->nf_item, "toolbar_more_btn");
    evas_object_del(vd->more_btn);
    vd->more_btn = nullptr;
}

void __info_set(UploadViewData *vd, const char *words, double progress)
{
    // A queue sets it many times a second, and mostly the words alone change.
    static const char key[] = "velora.info.shown";
    const bool is_shown = words && *words;
    elm_object_part_text_set(vd->layout, "velora.text.info", is_shown ? words : "");
    if (is_shown != (evas_object_data_get(vd->layout, key) != nullptr)) {
        elm_object_signal_emit(vd->layout, is_shown ? "velora,info,show" : "velora,info,hide", "velora");
        evas_object_data_set(vd->layout, key, is_shown ? key : nullptr);
    }
    Evas_Object *bar = elm_object_part_content_get(vd->layout, "velora.swallow.progress");
    if (progress < 0) {
        if (bar)
            evas_object_del(bar);
        return;
    }
    if (!bar) {
        bar = elm_progressbar_add(vd->layout);
        elm_object_style_set(bar, "overall");
        elm_progressbar_horizontal_set(bar, EINA_TRUE);
        ea_screen_reader_name_set(bar, __text("IDS_KQ_HEADER_VELORA_UPLOADS_ABB"));
        elm_object_part_content_set(vd->layout, "velora.swallow.progress", bar);
    }
    elm_progressbar_value_set(bar, progress);
}

void __page_create(UploadViewData *vd, Elm_Naviframe_Item_Pop_Cb back, Evas_Smart_Cb more)
{
    Evas_Object *nf = vd->ad->naviframe;
    vd->layout = elm_layout_add(nf);
    elm_layout_file_set(vd->layout, _velora_common_app_file("res/edje/velora.edj").c_str(), "main");
    Evas_Object *button = elm_button_add(nf);
    elm_object_style_set(button, "naviframe/end_btn/default");
    // Drawn as a sign; the words are for the screen reader.
    elm_object_domain_translatable_text_set(button, VELORA_SHARE_DOMAIN, "IDS_VELORA_BODY_BACK");
    vd->nf_item = elm_naviframe_item_push(nf, __text(s_title), button, nullptr, vd->layout, nullptr);
    __title_set(vd, s_title);
    elm_naviframe_item_pop_cb_set(vd->nf_item, back, vd);
    evas_object_smart_callback_add(nf, "elm,action,more_event", more, vd);
    evas_object_smart_callback_add(
        button, "clicked",
        [](void *naviframe, Evas_Object *, void *) { elm_naviframe_item_pop(static_cast<Evas_Object *>(naviframe)); },
        nf);
}

void __page_end(UploadViewData *vd, Evas_Smart_Cb more)
{
    evas_object_smart_callback_del_full(vd->ad->naviframe, "elm,action,more_event", more, vd);
    // What is below comes back into sight; the pop callback would refuse to be popped.
    elm_naviframe_item_pop_cb_set(vd->nf_item, nullptr, nullptr);
    elm_object_item_del(vd->nf_item);
}

// What the themes promise of sizes, measured as a list measures its rows.
#include "driver.h"
#include <gtest/gtest.h>
#include <string>

namespace {
constexpr struct {
    const char *file, *group, *name, *explanation;
} upload_rows[] = {
    {GENLIST_EDJ, "elm/genlist/item/2line.velora/dialogue", "elm.text.main.left.top", nullptr},
    {PLATFORM_EDJ, "elm/genlist/item/1line/dialogue", "elm.text.main.left", nullptr},
    {PLATFORM_EDJ, "elm/genlist/item/2line.top/dialogue", "elm.text.main.left.top", "elm.text.sub.left.bottom"},
};

// A file's row is replaced when its upload ends, and the rows below must not move.
TEST(Rows, OfOneFileHaveOneHeight)
{
    driver::start();
    Evas_Object *window = elm_win_add(nullptr, "rows", ELM_WIN_BASIC);
    for (const double scale : {0.9, 1.2, 1.8, 4.05})
        for (const int percent : {50, 100, 130, 200}) {
            edje_text_class_set("ui.body", "Sans", 26 * percent / 100);
            edje_text_class_set("ui.caption", "Sans", 22 * percent / 100);
            int heights[std::size(upload_rows)] = {}, *next = heights;
            for (const auto &one : upload_rows) {
                Evas_Object *row = edje_object_add(evas_object_evas_get(window));
                ASSERT_TRUE(edje_object_file_set(row, one.file, one.group));
                edje_object_scale_set(row, scale);
                edje_object_part_text_set(row, one.name, "harbour at dusk.jpg");
                if (one.explanation)
                    edje_object_part_text_set(row, one.explanation, "Failed");
                edje_object_signal_emit(row, "elm,state,elm.icon.2,visible", "elm");
                edje_object_message_signal_process(row);
                int width = 0;
                edje_object_size_min_restricted_calc(row, &width, next++, 900, 0);
                evas_object_del(row);
            }
            EXPECT_GE(heights[0], 96 * scale / 1.8) << percent << " percent, scale " << scale;
            EXPECT_EQ(heights[1], heights[0]) << percent << " percent, scale " << scale;
            EXPECT_EQ(heights[2], heights[0]) << percent << " percent, scale " << scale;
        }
    evas_object_del(window);
}

// The list asks for one text under three names, uses the objects of a row for another, and says only which texts are
// there.
TEST(Rows, ShowTheirWordsOnceAndKeepTheirHeight)
{
    driver::start();
    Evas_Object *window = elm_win_add(nullptr, "rows", ELM_WIN_BASIC), *row = edje_object_add(window);
    ASSERT_TRUE(edje_object_file_set(row, PLATFORM_EDJ, "elm/genlist/item/1line/default"));
    constexpr const char *names[] = {"elm.text.main", "elm.text.multiline",
                                     "elm.text.main.left"}; // in the list's order
    int first = 0, width = 0;
    for (const int given : {7, 1, 6, 2, 1, 4, 3, 5, 1}) {
        int shown = 0, height = 0;
        for (int i = 0; i < 3; i++) {
            edje_object_part_text_set(row, names[i], given & 1 << i ? "Camera upload" : "");
            if (given & 1 << i)
                edje_object_signal_emit(row, (std::string("elm,state,") + names[i] + ",visible").c_str(), "elm");
        }
        edje_object_signal_emit(row, given & 1 ? "elm,state,top" : "elm,state,bottom", "");
        edje_object_message_signal_process(row);
        for (int i = 0; i < 3; i++)
            shown += given & 1 << i && std::string(edje_object_part_state_get(row, names[i], nullptr)) == "default";
        edje_object_size_min_restricted_calc(row, &width, &height, 480, 0);
        first = first ? first : height;
        EXPECT_EQ(shown, 1) << given;
        EXPECT_EQ(height, first) << given;
    }
    evas_object_del(window);
}
} // namespace

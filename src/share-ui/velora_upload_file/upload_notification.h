#pragma once
// The ongoing notification of a running queue, and the result that stays behind. Any thread. 0, or -1 on failure
// (logged). Changes of the ongoing one are written at most ten times a second, in their order: one that comes too early
// is written a little later, unless another of its kind (text or bar) has taken its place, and its result is 0. None is
// written once the notification is deleted.

// Posts the ongoing notification in the place of the last result; *noti_id is its id, and as it was on failure.
int __progress_noti_new(const char *text, int *noti_id);
int __progress_noti_set_content(int noti_id, const char *text);
// "finished / remaining" as the content.
int __progress_noti_set_count(int noti_id, int finished, int remaining);
// progress: 0.0 to 1.0.
int __progress_noti_set_progress(int noti_id, double progress);
// Writes at once what waits for its time: the person has done something, and looks for what it did.
void __progress_noti_flush();
// 0 also when it is gone already; -1 for an id that is none.
int __progress_noti_delete(int noti_id);

// Posts a result. display_type: "success" or "fail"; paths: local ones, up to `count` and up to the first null (a full
// storage counts files that are not listed); folder: their destination, for another try, or null.
int __box_noti_new(const char *title, const char *text, const char *display_type, char **paths, int count,
                   const char *folder = nullptr);
// Extra data of a result's launch request, beside those that it must have: the path of the destination folder.
inline constexpr char RESULT_FOLDER_KEY[] = "folder_path";

// The local time by the device's clock setting; the caller's, g_free.
char *__get_format_time();

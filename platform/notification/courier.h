#pragma once
// Tells the bus about the store, on a thread of its own; for the library. Any thread may call, nothing waits.

#define NOTIFICATION_AGENT "com.orvant.NotificationAgent"
#define NOTIFICATION_AGENT_PATH "/com/orvant/NotificationAgent"
#define NOTIFICATION_DAEMON "org.freedesktop.Notifications"
#define NOTIFICATION_DAEMON_PATH "/org/freedesktop/Notifications"

// The store has changed: the agent is told, or started. Changes in quick succession are told once.
void courier_changed();
// Shows a status message, or logs it.
void courier_post(const char *message);

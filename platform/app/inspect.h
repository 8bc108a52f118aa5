#pragma once

// Lets scripts and tests that drive the program from outside find what to click: when $ORVANT_INSPECT is set, the
// session bus connection gets an object /com/orvant/Inspect whose method com.orvant.Inspect.Visible answers with an
// array of (kind, text, x, y, width, height), one per visible text and per widget that has a text, bottom to top. Kind
// is "text", or the widget's type ("disabled" for a button that cannot be pressed; a progress bar's text is its value,
// such as "37 %"), or at last "focus" for what has the keys' focus: its text (a row's, where a row has it), or its type
// when it has none. Places are in pixels of the screen. The method com.orvant.Inspect.Keys answers with the number of
// keys that were pressed, let go and dealt with since the start. Without the variable nothing happens. To be called
// once, on the main loop, when the toolkit and the bus connection are there.
void inspect_publish();

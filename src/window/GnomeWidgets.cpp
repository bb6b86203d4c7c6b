// The main window's widget table: every widget of the window in creation order. Visible
// texts, accelerators, option-menu entries and form attachments come from the resource file.
#include <Xm/BulletinB.h>
#include <Xm/CascadeB.h>
#include <Xm/CascadeBG.h>
#include <Xm/FileSB.h>
#include <Xm/Form.h>
#include <Xm/Frame.h>
#include <Xm/Label.h>
#include <Xm/LabelG.h>
#include <Xm/MessageB.h>
#include <Xm/PushB.h>
#include <Xm/PushBG.h>
#include <Xm/RowColumn.h>
#include <Xm/ScrolledW.h>
#include <Xm/SeparatoG.h>
#include <Xm/Separator.h>
#include <Xm/TextF.h>
#include <Xm/ToggleBG.h>

#include "toolkit/xm/KLImageView.h"
#include "window/Gnome.h"

#include "chart/KLSyncChart.h"
#include "scene/gl/KLSceneView.h"

const KLWidgetSpec widget_spec[] = {
    {"-", "messageDialog", XmCreateMessageDialog},               // 1
    {"-", "fileBrowser", XmCreateFileSelectionDialog},           // 2
    {"-", "optionsDialog", XmCreateFormDialog},                  // 3
    {"-", "selectDialog", XmCreateFormDialog},                   // 4
    {"-", "applyDialog", XmCreateFormDialog},                    // 5
    {"-", "linkDialog", XmCreateFormDialog},                     // 6
    {"-", "refDialog", XmCreateFormDialog},                      // 7
    {".+", "refPrefixBox", XmCreateForm},                        // 8
    {"..+", "refExt", XmCreateTextField},                        // 9
    {"..+", "refExtLabel", XmCreateLabel},                       // 10
    {"..+", "refPrefixLabel", XmCreateLabel},                    // 11
    {"..+", "refPrefix", XmCreateTextField},                     // 12
    {".+", "refRangeBox", XmCreateForm},                         // 13
    {"..+", "refStartLabel", XmCreateLabel},                     // 14
    {"..+", "refStart", XmCreateTextField},                      // 15
    {"..+", "refEndLabel", XmCreateLabel},                       // 16
    {"..+", "refEnd", XmCreateTextField},                        // 17
    {"..+", "refByLabel", XmCreateLabel},                        // 18
    {"..+", "refBy", XmCreateTextField},                         // 19
    {".+", "refSep", XmCreateSeparator},                         // 20
    {".+", "refButtonBox", XmCreateForm},                        // 21
    {"..+", "refLoadOk", XmCreatePushButton},                    // 22
    {"..+", "refLoadCancel", XmCreatePushButton},                // 23
    {"+", "console", XmCreateForm},                              // 24
    {".+", "menuBar", XmCreateMenuBar},                          // 25
    {"..+", "file", XmCreateCascadeButtonGadget},                // 26
    {"..-", "fileMenu", XmCreatePulldownMenu},                   // 27
    {"...+", "openKeyset", XmCreatePushButtonGadget},            // 28
    {"...+", "saveKeyset", XmCreatePushButtonGadget},            // 29
    {"...+", "sepMenu", XmCreateSeparatorGadget},                // 30
    {"...+", "newTrack", XmCreatePushButtonGadget},              // 31
    {"...+", "openTrack", XmCreatePushButtonGadget},             // 32
    {"...+", "saveTrack", XmCreatePushButtonGadget},             // 33
    {"...+", "sepMenu", XmCreateSeparatorGadget},                // 34
    {"...+", "applyWire", XmCreatePushButtonGadget},             // 35
    {"...+", "sepMenu", XmCreateSeparatorGadget},                // 36
    {"...+", "quit", XmCreatePushButtonGadget},                  // 37
    {"..+", "edit", XmCreateCascadeButtonGadget},                // 38
    {"..-", "editMenu", XmCreatePulldownMenu},                   // 39
    {"...+", "addKeyframe", XmCreatePushButtonGadget},           // 40
    {"...+", "sepMenu", XmCreateSeparatorGadget},                // 41
    {"...+", "deleteKeyframe", XmCreatePushButtonGadget},        // 42
    {"...+", "deleteKeyframeRegion", XmCreatePushButtonGadget},  // 43
    {"...+", "sepMenu", XmCreateSeparatorGadget},                // 44
    {"...+", "play", XmCreatePushButtonGadget},                  // 45
    {"...+", "sepMenu", XmCreateSeparatorGadget},                // 46
    {"...+", "audioPanel", XmCreatePushButtonGadget},            // 47
    {"..+", "display", XmCreateCascadeButtonGadget},             // 48
    {"..-", "displayMenu", XmCreatePulldownMenu},                // 49
    {"...+", "midpoint", XmCreateToggleButtonGadget},            // 50
    {"...+", "keyframe", XmCreateToggleButtonGadget},            // 51
    {"...+", "dissolve", XmCreateToggleButtonGadget},            // 52
    {"...+", "sepMenu", XmCreateSeparatorGadget},                // 53
    {"...+", "points", XmCreateToggleButtonGadget},              // 54
    {"...+", "lines", XmCreateToggleButtonGadget},               // 55
    {"...+", "polygons", XmCreateToggleButtonGadget},            // 56
    {"...+", "polygonsboth", XmCreateToggleButtonGadget},        // 57
    {"...+", "sepMenu", XmCreateSeparatorGadget},                // 58
    {"...+", "showTextures", XmCreateToggleButtonGadget},        // 59
    {"...+", "sepMenu", XmCreateSeparatorGadget},                // 60
    {"...+", "keyVuSet", XmCreatePushButtonGadget},              // 61
    {"...+", "keyVuClear", XmCreatePushButtonGadget},            // 62
    {"...+", "sepMenu", XmCreateSeparatorGadget},                // 63
    {"...+", "loadGeometry", XmCreateToggleButtonGadget},        // 64
    {"..+", "reference", XmCreateCascadeButtonGadget},           // 65
    {"..-", "referenceMenu", XmCreatePulldownMenu},              // 66
    {"...+", "refLoad", XmCreatePushButtonGadget},               // 67
    {"...+", "refDelete", XmCreatePushButtonGadget},             // 68
    {"...+", "refAdjust", XmCreatePushButtonGadget},             // 69
    {"...+", "refRegion", XmCreatePushButtonGadget},             // 70
    {"..+", "keySets", XmCreateCascadeButtonGadget},             // 71
    {"..-", "keySetsMenu", XmCreatePulldownMenu},                // 72
    {"..+", "recognizer", XmCreateCascadeButtonGadget},          // 73
    {"..-", "recognizerMenu", XmCreatePulldownMenu},             // 74
    {"..+", "help", XmCreateCascadeButton},                      // 75
    {"..-", "helpMenu", XmCreatePulldownMenu},                   // 76
    {"...+", "helpRef", XmCreatePushButtonGadget},               // 77
    {"...+", "helpTut", XmCreatePushButtonGadget},               // 78
    {"...+", "sepMenu", XmCreateSeparator},                      // 79
    {"...+", "versionInfo", XmCreatePushButtonGadget},           // 80
    {"...+", "sepMenu", XmCreateSeparator},                      // 81
    {"...+", "vuErrors", XmCreatePushButtonGadget},              // 82
    {".+", "layoutBank", XmCreateForm},                          // 83
    {"..+", "tileFrame", XmCreateScrolledWindow},                // 84
    {"...+", "tiles", XmCreateForm},                             // 85
    {"..+", "midForm", XmCreateForm},                            // 86
    {"...+", "audioButtonFrame", XmCreateFrame},                 // 87
    {"....+", "audioButtonBank", XmCreateRowColumn},             // 88
    {".....+", "fastReverse", XmCreatePushButton},               // 89
    {".....+", "playReverse", XmCreatePushButton},               // 90
    {".....+", "playStop", XmCreatePushButton},                  // 91
    {".....+", "playForward", XmCreatePushButton},               // 92
    {".....+", "fastForward", XmCreatePushButton},               // 93
    {".....+", "playForwardSave", XmCreatePushButton},           // 94
    {".....+", "sepItem1", XmCreateSeparator},                   // 95
    {".....+", "speedMenu", XmCreateSimpleOptionMenu},           // 96
    {".....+", "repeatMenu", XmCreateSimpleOptionMenu},          // 97
    {".....+", "sepItem2", XmCreateSeparator},                   // 98
    {".....+", "addKey", XmCreatePushButton},                    // 99
    {".....+", "deleteKey", XmCreatePushButton},                 // 100
    {".....+", "deleteKeyRegion", XmCreatePushButton},           // 101
    {".....+", "sepItem3", XmCreateSeparator},                   // 102
    {".....+", "keyLabel", XmCreateLabel},                       // 103
    {".....+", "linearKey", XmCreatePushButton},                 // 104
    {".....+", "easeKey", XmCreatePushButton},                   // 105
    {".....+", "smoothKey", XmCreatePushButton},                 // 106
    {".....+", "sepItem3", XmCreateSeparator},                   // 107
    {".....+", "valLabel", XmCreateLabel},                       // 108
    {".....+", "valTypein", XmCreateTextField},                  // 109
    {"..+", "bottomForm", XmCreateForm},                         // 110
    {"...+", "previewBank", XmCreateForm},                       // 111
    {"....+", "keyVuBank", XmCreateForm},                        // 112
    {".....+", "keyBox", XmCreateForm},                          // 113
    {"......+", "keyVuFrame", XmCreateFrame},                    // 114
    {".......+", "keyVuForm", XmCreateForm},                     // 115
    {"........+", "keyVu", KLImageView::Create},                 // 116
    {"........-", "keyScn", KLSceneView::Create},                // 117
    {"........-", "keyFake", XmCreateRowColumn},                 // 118
    {"......+", "keyButtonBank", XmCreateForm},                  // 119
    {".......+", "keyVuLabel", XmCreateLabel},                   // 120
    {".......+", "keyVuToggle", XmCreateSimpleOptionMenu},       // 121
    {".......+", "keyVuLookAt", XmCreatePushButton},             // 122
    {".......+", "keyVuPan", XmCreatePushButton},                // 123
    {".......+", "keyVuZoom", XmCreatePushButton},               // 124
    {".......+", "keyVuTumble", XmCreatePushButton},             // 125
    {"....+", "mixVuBank", XmCreateForm},                        // 126
    {".....+", "mixBox", XmCreateForm},                          // 127
    {"......+", "mixVuFrame", XmCreateFrame},                    // 128
    {".......+", "mixVuForm", XmCreateForm},                     // 129
    {"........+", "mixScn", KLSceneView::Create},                // 130
    {"........-", "mixFake", XmCreateBulletinBoard},             // 131
    {"......+", "mixButtonBank", XmCreateForm},                  // 132
    {".......+", "mixVuLabel", XmCreateLabel},                   // 133
    {".......+", "mixVuToggle", XmCreateSimpleOptionMenu},       // 134
    {".......+", "mixVuLookAt", XmCreatePushButton},             // 135
    {".......+", "mixVuPan", XmCreatePushButton},                // 136
    {".......+", "mixVuZoom", XmCreatePushButton},               // 137
    {".......+", "mixVuTumble", XmCreatePushButton},             // 138
    {"....+", "refVuBank", XmCreateForm},                        // 139
    {".....+", "refButtonBank", XmCreateForm},                   // 140
    {"......+", "refVuLabel", XmCreateLabel},                    // 141
    {"......+", "refVuToggle", XmCreateSimpleOptionMenu},        // 142
    {".....+", "refVuFrame", XmCreateFrame},                     // 143
    {"......+", "refVuForm", XmCreateForm},                      // 144
    {".......+", "refVu", KLImageView::Create},                  // 145
    {".......-", "refFake", XmCreateBulletinBoard},              // 146
    {"....-", "info", XmCreateRowColumn},                        // 147
    {".....+", "labelDeck", XmCreateRowColumn},                  // 148
    {"......+", "timecodeLabel", XmCreateLabelGadget},           // 149
    {"......+", "timecode", XmCreateLabelGadget},                // 150
    {".....+", "labelDeck", XmCreateRowColumn},                  // 151
    {"......+", "frameLabel", XmCreateLabelGadget},              // 152
    {"......+", "frame", XmCreateLabelGadget},                   // 153
    {"..+", "infoBar", XmCreateFrame},                           // 154
    {"...+", "infoBarForm", XmCreateForm},                       // 155
    {"....+", "infoTimeBox", XmCreateForm},                      // 156
    {".....+", "infoTimeLabel", XmCreateLabel},                  // 157
    {".....+", "infoTimeValue", XmCreateLabel},                  // 158
    {"....+", "infoFrameBox", XmCreateForm},                     // 159
    {".....+", "infoFrameLabel", XmCreateLabel},                 // 160
    {".....+", "infoFrameValue", XmCreateLabel},                 // 161
    {"....+", "infoKeysetTitle", XmCreateLabel},                 // 162
    {"....+", "infoDurationBox", XmCreateForm},                  // 163
    {".....+", "infoDurationLabel", XmCreatePushButton},         // 164
    {".....+", "infoDurationValue", XmCreatePushButton},         // 165
    {"..+", "syncChart", KLSyncChart::Create},                   // 166
    {nullptr, nullptr, nullptr},
};

const int widget_spec_rows = sizeof(widget_spec) / sizeof(widget_spec[0]) - 1;

#include <cstdlib>
#include <cstring>
#include <map>
#include <string>

#include "platform/dictionary.h"
#include "platform/msg.h"
#include "platform/msg_catalogue.h"

Bool Msg_LoadCatalogue(const char *locale, const char *path) {
  if (locale == nullptr || locale[0] == '\0' || std::strcmp(locale, "en") == 0) {
    MsgPending_Add(std::string("cannot load a catalogue for the default locale \"") +
                   (locale != nullptr ? locale : "") + "\"");
    return FALSE;
  }
  Dictionary *dict = Dictionary_Create();
  MsgList *messages = nullptr;
  bool ok = Dictionary_LoadEx(dict, path, &messages);
  if (ok) {
    std::map<std::string, std::string> texts;
    Dictionary_Iterate(
        dict,
        [](const char *name, const char *value, void *ctx) -> Bool {
          // Later lines win, as for every dictionary lookup.
          (*static_cast<std::map<std::string, std::string> *>(ctx))[name] = value;
          return TRUE;
        },
        &texts);
    MsgCatalogue_Install(locale, std::move(texts));
  } else {
    char *text = MsgList_ToString(messages);
    MsgPending_Add(std::string("cannot load message catalogue \"") + path + "\": " + text);
    std::free(text);
  }
  MsgList_Free(messages);
  Dictionary_Free(dict);
  return ok;
}

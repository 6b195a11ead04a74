#include "platform/msg.h"

#include "platform/msg_catalogue.h"

Bool Msg_LoadCatalogue(const char *locale, const char *path) {
  MsgPending_Add(std::string("cannot load message catalogue \"") + path + "\" for locale \"" +
                 locale + "\": catalogues are not supported yet");
  return FALSE;
}

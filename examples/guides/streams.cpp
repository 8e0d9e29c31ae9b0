#include "common/uZqClasses.h"

using namespace zq;

int main() {
  const UnicodeString FileName = u"streams_guide.txt";

  TZqMemoryStream Packet(256);  // grows by 256 bytes
  Packet.WriteWord(7);
  Packet.WriteBytes({1, 2, 3});
  Packet.SetPosition(0);
  const Word Kind = Packet.ReadWord();

  TZqStringStream Page(65001);
  Page.Add(u"Grüße");
  Page.AddChar(u'!');
  Page.SaveToFile(FileName);  // with a byte order mark

  TZqStringStream Again(1200);
  Again.LoadFromFile(FileName);  // converted, without the mark
  const UnicodeString Text = Again.AsString();

  return Kind == 7 && Text == u"Grüße!" ? 0 : 1;
}

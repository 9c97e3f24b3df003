#include "host/HostTestSupport.h"

#include "Orb_Property.h"

#include <gtest/gtest.h>

#include <cstring>
#include <string>
#include <thread>
#include <vector>

namespace {

using namespace HostTest;
using namespace std::string_literals;

// Every change between empty, short (kept in the property), exactly the short limit, just over it,
// and long values with NUL bytes, including a value taken from the property's own bytes.
TEST(PropertyValueTest, EveryLengthChangeKeepsEveryByte) {
  std::string const limit(Orb_Property::kSmallValue, 'x');
  std::vector<std::string> const values = {
      "", "a", "\0"s, limit, limit + "y", "lib:cell\0tail"s, std::string(300, '\0') + "z"};
  for (std::string const &from : values) {
    for (std::string const &to : values) {
      SCOPED_TRACE(std::to_string(from.size()) + " -> " + std::to_string(to.size()));
      Orb_Property property(Orb_Property::STRING, "V", from);
      EXPECT_EQ(property.GetValue(), from);
      property.SetStringValue(to);
      EXPECT_EQ(property.GetValue(), to);
      EXPECT_STREQ(property.GetStringValue(), to.c_str());
      property.SetStringValue(property.GetValue());
      EXPECT_EQ(property.GetValue(), to);
      if (!to.empty()) {
        property.SetStringValue(property.GetValue().substr(1));
        EXPECT_EQ(property.GetValue(), to.substr(1));
      }
    }
  }
}

// A value set before or after list entries stays beside them, as does a string property given
// entries; members keep order and repeated names. Same-named properties are replaced in place on
// create and copy (NUL bytes included); deleting another holder's property does nothing.
TEST(PropertyValueTest, ValuesListsAndReplacementsInPlace) {
  Orb_PropertyHolder holder, other;
  Orb_Property *text = holder.CreatePropertyString("S", "a long value, kept");
  text->AppendString("e\0"s);
  Orb_Property *strings = holder.CreatePropertyStringList("L");
  strings->AppendString("1");
  strings->SetStringValue("v");
  strings->AppendString("2");
  Orb_Property *list = holder.CreatePropertyList("M");
  for (char const *name : {"k", "j", "k"})
    list->CreatePropertyString(name, name);
  EXPECT_EQ(PropertiesOf(holder), "S=a long value, kepte\0 L[v1,2] M{k:k,j:j,k:k}"s);
  strings->ClearStrings();
  EXPECT_EQ(strings->GetValue(), "v");
  EXPECT_TRUE(strings->GetStrings().empty());

  holder.CreatePropertyStringList("S")->AppendString("x");
  holder.DeleteProperty(other.CreatePropertyString("M", "other"));
  holder.DeleteProperty("L");
  other.CreatePropertyList("O")->CreatePropertyString("k", "v")->SetStringValue("v\0w"s);
  other.CreatePropertyString("N", "")->SetStringValue("\0n"s);
  holder.CopyPropertiesFrom(other);
  holder.CopyPropertiesFrom(holder);
  EXPECT_EQ(PropertiesOf(holder), "S[x] M=other O{k:v\0w} N=\0n"s);
}

// Deleting down to nothing leaves an empty holder that works as new, and order survives growth
// and deletes in the middle.
TEST(PropertyHolderTest, GrowsAndEmptiesInOrder) {
  Orb_PropertyHolder holder;
  for (int round = 0; round < 2; ++round) {
    std::string expected;
    for (int i = 0; i < 40; ++i)
      holder.CreatePropertyString(("P" + std::to_string(i)).c_str(), std::to_string(i).c_str());
    for (int i = 0; i < 40; i += 2)
      holder.DeleteProperty(("P" + std::to_string(i)).c_str());
    for (int i = 1; i < 40; i += 2)
      expected += (i > 1 ? " P" : "P") + std::to_string(i) + "=" + std::to_string(i);
    EXPECT_EQ(PropertiesOf(holder), expected);
    while (!holder.GetProperties().empty())
      holder.DeleteProperty(holder.GetProperties()[0]);
    EXPECT_EQ(holder.GetPropertyByName("P1"), nullptr);
  }
}

// A name is stored once however many properties, copies and list members use it, and goes with
// the last of them.
TEST(PropertyNameTest, StoredOnceAndFreedWithTheLastUse) {
  std::size_t const before = Orb_Property::GetNameCount();
  {
    Orb_PropertyHolder a, b;
    for (int i = 0; i < 50; ++i) {
      std::string const name = "NameTest" + std::to_string(i);
      a.CreatePropertyString(name.c_str(), "1");
      a.CreatePropertyString(name.c_str(), "2");
      b.CreatePropertyList("NameTestList")->CreatePropertyString(name.c_str(), "m");
    }
    b.CopyPropertiesFrom(a);
    EXPECT_EQ(Orb_Property::GetNameCount(), before + 51);
    EXPECT_EQ(a.GetPropertyByName("NameTest7")->GetName(),
              b.GetPropertyByName("NameTest7")->GetName());
    a.DeleteProperty("NameTest7");
    EXPECT_EQ(Orb_Property::GetNameCount(), before + 51);
  }
  EXPECT_EQ(Orb_Property::GetNameCount(), before);
}

// Threads creating and dropping properties of the same few names leave no name behind and never
// mix names up.
TEST(PropertyNameTest, SharedAcrossThreads) {
  std::size_t const before = Orb_Property::GetNameCount();
  std::vector<std::thread> threads;
  threads.reserve(4);
  std::vector<int> wrong(4, 0);
  for (int t = 0; t < 4; ++t) {
    threads.emplace_back([t, &wrong] {
      for (int i = 0; i < 2000; ++i) {
        Orb_PropertyHolder holder;
        std::string const name = "ThreadName" + std::to_string((i + t) % 3);
        holder.CreatePropertyString(name.c_str(), "v");
        if (std::strcmp(holder.GetProperties()[0]->GetName(), name.c_str()) != 0)
          ++wrong[t];
      }
    });
  }
  for (std::thread &thread : threads)
    thread.join();
  EXPECT_EQ(wrong, std::vector<int>(4, 0));
  EXPECT_EQ(Orb_Property::GetNameCount(), before);
}

} // namespace

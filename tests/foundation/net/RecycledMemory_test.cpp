#include <gtest/gtest.h>

#include <boost/make_shared.hpp>

#include "foundation/net/RecycledMemory.h"
#include "foundation/net/Response.h"

TEST(RecycledMemory, AdaptedVectorsLiveWithoutACopyAndNoBytesTravelAsNoBody)
{
    boost::shared_ptr<std::vector<unsigned char> > bytes(new std::vector<unsigned char>{'j', 's', 'o', 'n'});
    const unsigned char* original = bytes->data();
    boost::shared_ptr<RecycledMemory const> block = RecycledMemory::AdaptAsRecycledMemory(bytes);
    bytes.reset();  // the block is now the vector's only owner
    ASSERT_TRUE(block);
    EXPECT_EQ(block->Data(), original);
    EXPECT_EQ(std::string(reinterpret_cast<const char*>(block->Data()), block->Size()), "json");

    EXPECT_FALSE(RecycledMemory::AdaptAsRecycledMemory(boost::shared_ptr<std::vector<unsigned char> >()));
    EXPECT_FALSE(RecycledMemory::AdaptAsRecycledMemory(boost::make_shared<std::vector<unsigned char> >()));
    EXPECT_FALSE(RecycledMemory::CopyOf("", 0));
}

TEST(HeaderList, LookupUsesTheLastEntryOfAName)
{
    tolmonet::HeaderList headers;
    const ImmutableString name = ImmutableString::CreateStatic("ETAG");
    EXPECT_EQ(tolmonet::FindHeader(headers, name), nullptr);
    headers.emplace(ImmutableString::CreateDynamic("ETAG"), ImmutableString::CreateDynamic("\"1\""));
    headers.emplace(ImmutableString::CreateDynamic("ETAG"), ImmutableString::CreateDynamic("\"2\""));
    headers.emplace(ImmutableString::CreateDynamic("Etag"), ImmutableString::CreateDynamic("other case"));
    ASSERT_NE(tolmonet::FindHeader(headers, name), nullptr);
    EXPECT_EQ(tolmonet::FindHeader(headers, name)->ToStdString(), "\"2\"");
}

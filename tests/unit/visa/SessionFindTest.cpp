#include "unit/visa/SessionFixture.h"

using testing::ElementsAre;

namespace
{

const std::map<ViAttr, std::string> AllTexts = {
    {VI_KY_ATTR_LXI_MANF, "Oltrava"},
    {VI_KY_ATTR_LXI_MODEL, "OS-1"},
    {VI_KY_ATTR_LXI_SERIAL, "0815"},
    {VI_KY_ATTR_LXI_VERSION, "1.2"},
    {VI_KY_ATTR_LXI_DESCRIPTION, "Bench supply \xC3\xBC"},
    {VI_KY_ATTR_LXI_HOSTNAME, "supply.local."},
};

class SessionFind : public SessionTest
{
protected:
    void find()
    {
        char expression[] = "?*";
        char found[256];
        m_session->findRsrc(expression, &m_list, found);
    }

    unsigned m_list = 0;
};

} // namespace

TEST_F(SessionFind, ReadsSixTextsOfEachResourceFound)
{
    standin::addResource({.name = "TCPIP::a::INSTR", .texts = AllTexts});
    find();
    EXPECT_THAT(texts(),
                ElementsAre("viFindRsrc(vi= 1, expr= ?*, findList= 1001, retcnt= 1, instrDesc= TCPIP::a::INSTR)",
                            "viGetAttribute(vi= 1001,type= VI_KY_ATTR_LXI_MANF,value= Oltrava)",
                            "viGetAttribute(vi= 1001,type= VI_KY_ATTR_LXI_MODEL,value= OS-1)",
                            "viGetAttribute(vi= 1001,type= VI_KY_ATTR_LXI_SERIAL,value= 0815)",
                            "viGetAttribute(vi= 1001,type= VI_KY_ATTR_LXI_VERSION,value= 1.2)",
                            "viGetAttribute(vi= 1001,type= VI_KY_ATTR_LXI_DESCRIPTION,value= Bench supply \xC3\xBC)",
                            "viGetAttribute(vi= 1001,type= VI_KY_ATTR_LXI_HOSTNAME,value= supply.local.)"));
    EXPECT_EQ(m_session->lxiIdentification, "Oltrava,OS-1,0815,1.2");
    EXPECT_EQ(m_session->lxiDescription, QString::fromUtf8("Bench supply ü"));
    EXPECT_EQ(m_session->lxiHostName, "supply.local");
}

TEST_F(SessionFind, DropsOneDotOfTheHostNameAndNoMore)
{
    auto some = AllTexts;
    some[VI_KY_ATTR_LXI_HOSTNAME] = "odd..";
    standin::addResource({.name = "A", .texts = some});
    some[VI_KY_ATTR_LXI_HOSTNAME] = "plain";
    standin::addResource({.name = "B", .texts = some});
    find();
    EXPECT_EQ(m_session->lxiHostName, "odd.");
    char found[256];
    m_session->findNext(m_list, found);
    EXPECT_EQ(m_session->lxiHostName, "plain");
}

TEST_F(SessionFind, EndsQuietlyAtTheFirstTextThatIsMissing)
{
    auto some = AllTexts;
    some.erase(VI_KY_ATTR_LXI_DESCRIPTION);
    standin::addResource({.name = "A", .texts = some});
    m_session->lxiDescription = "before";
    m_session->lxiHostName = "before";
    find(); // throws nothing
    EXPECT_EQ(m_session->lxiIdentification, "Oltrava,OS-1,0815,1.2");
    EXPECT_EQ(m_session->lxiDescription, "before");
    EXPECT_EQ(m_session->lxiHostName, "before");
    EXPECT_EQ(lastText(), "viGetAttribute(vi= 1001,type= VI_KY_ATTR_LXI_DESCRIPTION,value= )");
}

TEST_F(SessionFind, KeepsTheOldIdentificationWhenOneOfItsTextsIsMissing)
{
    auto some = AllTexts;
    some.erase(VI_KY_ATTR_LXI_VERSION);
    standin::addResource({.name = "A", .texts = some});
    m_session->lxiIdentification = "before";
    find();
    EXPECT_EQ(m_session->lxiIdentification, "before");
}

TEST_F(SessionFind, ReturnsToTheResourceManagerAfterwards)
{
    standin::addResource({.name = "A", .texts = AllTexts});
    standin::addResource({.name = "B"});
    find();
    m_session->setAttribute(VI_KY_ATTR_TCPIP_FIND_RSRC_TMO, 1, false);
    EXPECT_EQ(lastText(), "viSetAttribute(vi= 1,type= VI_KY_ATTR_TCPIP_FIND_RSRC_TMO,value= 0x1)");
    char found[256];
    m_session->findNext(m_list, found); // a resource without texts
    m_session->setAttribute(VI_KY_ATTR_TCPIP_FIND_RSRC_TMO, 1, false);
    EXPECT_EQ(lastText(), "viSetAttribute(vi= 1,type= VI_KY_ATTR_TCPIP_FIND_RSRC_TMO,value= 0x1)");
}

TEST_F(SessionFind, AsksTheFindListEvenWhileASessionIsOpen)
{
    openSession();
    standin::addResource({.name = "A", .texts = AllTexts});
    find();
    EXPECT_EQ(standin::calls("viGetAttribute").at(0).handle, 1001u);
    EXPECT_EQ(m_session->lxiHostName, "supply.local");
}

TEST_F(SessionFind, ShowsForeignBytesAsReplacementCharacters)
{
    auto some = AllTexts;
    some[VI_KY_ATTR_LXI_DESCRIPTION] = "a\xFF";
    standin::addResource({.name = "A", .texts = some});
    find();
    EXPECT_EQ(m_session->lxiDescription, QString("a") + QChar(0xFFFD));
}

TEST_F(SessionFind, WorksWithoutAPlaceForTheList)
{
    standin::addResource({.name = "A", .texts = AllTexts});
    char expression[] = "?*";
    char found[256];
    EXPECT_EQ(m_session->findRsrc(expression, nullptr, found), 1u);
    EXPECT_STREQ(found, "A");
}

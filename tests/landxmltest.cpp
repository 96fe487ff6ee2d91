#include "tests/support/filetest.h"
#include "tin/tin.h"

using namespace kelm::test;

namespace {

/// A square of one unit; the height of a point is its number. The fifth lies within, near 1.
const std::string kPoints = "<Pnts><P id='1'>0 10 1</P><P id='2'>0 11 2</P><P id='3'>1 10 3</P>"
                            "<P id='4'>1 11 4</P><P id='5'>.2 10.2 5</P></Pnts>";

std::string Definition(const std::string& content, const std::string& type = "TIN") {
    return "<Surface name='EG'><Definition surfType='" + type + "'>" + content +
           "</Definition></Surface>\n";
}
std::string Tin(const std::string& faces, const std::string& points = kPoints) {
    return "<Surfaces>\n" + Definition(points + "\n<Faces>" + faces + "</Faces>") + "</Surfaces>";
}
const std::string kTin = Tin("<F>1 2 3</F><F>2 4 3</F>");

std::string Document(const std::string& content, const std::string& attributes = "") {
    return "<?xml version='1.0'?>\n<LandXML" + attributes + ">" + content + "</LandXML>\n";
}

/// @return a layer's type, and its shapes: the id, and the heights of the ring
std::string Describe(ZARLayer_t* poLayer) {
    std::string text = "type " + std::to_string(ZARGetLayerType(poLayer, 0));
    int nShapes = 0;
    for (int nId = ZARGetNext(poLayer, -1); nId != -1; nId = ZARGetNext(poLayer, nId)) {
        const ZARShape& oShape = *ZARGetShapeRef(poLayer, nId);
        text += ' ' + std::to_string(nId) + '=';
        for (int n = 0; n < oShape.vertexCount; ++n)
            text += std::to_string(int(oShape.vertices[n].z));
        ++nShapes;
    }
    EXPECT_EQ(nShapes, poLayer->shapeCount);
    return text;
}

struct LandXmlTest : FileTest {
    File Open(const std::string& text, const std::string& name = "a.xml") const {
        return OpenFile(moFolder.WriteFile(name, text));
    }
    /// @return the layers of a document, or empty if it is refused
    std::string Read(const std::string& text) {
        std::string layers;
        moTranscript.Refuses([&] {
            const File poFile = Open(text);
            for (int n = 0; (n = ZARSegNext(poFile.get(), ZAR_SEGMENT_VECTOR, n)) != 0;)
                layers += (n > 1 ? "; " : "") + Describe(ZARGetLayer(poFile.get(), n));
        });
        return layers;
    }
};

TEST_F(LandXmlTest, EachVersionAndEncodingGivesTheSameSurface) {
    const std::string expected = "type 2 1=1231 2=2432";
    const std::string schema = "http://www.landxml.org/schema/LandXML-";
    for (const std::string version : {"1.0", "1.1", "1.2", "2.0"}) {
        const std::string attributes = " version='" + version + "' xmlns='" + schema + version;
        EXPECT_EQ(Read(Document("<Project/>" + kTin, attributes + "'")), expected) << version;
    }
    std::string prefixed = Document(kTin, " xmlns:l='" + schema + "1.2'");
    for (std::size_t n = 30; (n = prefixed.find('<', n)) != std::string::npos; ++n)
        prefixed.insert(prefixed[n + 1] == '/' ? n + 2 : n + 1, "l:");
    prefixed.replace(prefixed.find("<LandXML"), 2, "<l:L");
    EXPECT_EQ(Read(prefixed), expected) << prefixed;

    const std::string latin = Document("<!-- \xE9 -->" + kTin).replace(19, 0, " encoding='X'");
    for (const char* pszName : {"ISO-8859-1", "iso-8859-15", "Windows-1252"})
        EXPECT_EQ(Read(std::string(latin).replace(latin.find('X'), 1, pszName)), expected);
    EXPECT_EQ(Read(latin), "") << "no such encoding";
    EXPECT_EQ(Read("\xEF\xBB\xBF" + Document(kTin)), expected);
    std::string wide = "\xFF\xFE";
    for (const char c : Document(kTin))
        wide.append({c, '\0'});
    EXPECT_EQ(Read(wide), expected);
}

TEST_F(LandXmlTest, PointsAreNorthingEastingElevation) {
    const std::string points =
        "<Pnts><P id='7'>\n4e6\t+500000.25 -1.5 </P>"
        "<P id='8'><![CDATA[4000001 500001]]> 2</P><P id='9'>&n; 3</P></Pnts>";
    const std::string text = Document(Tin("<F>7 8 9</F>", points));
    const File poFile = Open("<!DOCTYPE LandXML [<!ENTITY n '4000002 500000'>]>" + text.substr(22));
    ZARLayer_t* poLayer = ZARGetLayer(poFile.get(), 1);
    const std::array<double, 3> first{500000.25, 4e6, -1.5};
    EXPECT_EQ(ReadShape(poLayer, 1),
              (Ring{first, {500001, 4000001, 2}, {500000, 4000002, 3}, first}));
    ZARVertex oLow, oHigh;
    ZARGetExtents(poLayer, &oLow, &oHigh);
    EXPECT_TRUE(oLow.x == 500000 && oLow.y == 4e6 && oLow.z == -1.5 && oHigh.x == 500001 &&
                oHigh.y == 4000002 && oHigh.z == 3);
    EXPECT_EQ(ZARLayer2fp(poLayer), poFile.get());
}

const struct {
    std::string moContent;
    const char* mpszLayers;
} kContents[] = {
    // Invisible faces and neighbours; several blocks; elements of others.
    {Tin("<F i='1'>1 2 3</F><F i='0' n='0 1 0'>2 4 3</F>"), "type 2 2=2432"},
    {Tin("<F>1 2 3</F></Faces>" + kPoints +
             "<Faces>x<Feature><F>1 2 3</F></Feature><F>2 <x>9</x>4 3</F>",
         "<Faces><F>4 2 1</F></Faces>"),
     "type 2 1=4214 2=1231 3=2432"},
    {Tin("<F>2147483648 7 4294967295</F><F>7 11 2147483648</F>",
         "<Pnts><P id='4294967295'>0 0 3</P><P id='11'>1 1 4</P><P id='2147483648'>1 0 1</P>"
         "<P id='7'>0 1 2</P></Pnts>"),
     "type 2 1=1231 2=2412"},
    // Four corners: both diagonals, upright, one corner on a side, crossing itself, a triangle.
    {Tin("<F>1 2 4 3</F><F>2 5 3 1</F><F>5 3 1 2</F>"),
     "type 2 10=1241 11=1431 20=2512 21=5315 30=5315 31=5125"},
    {Tin("<F>6 7 8 9</F>", "<Pnts><P id='6'>0 0 1</P><P id='7'>0 1 2</P><P id='8'>0 1 3</P>"
                           "<P id='9'>0 0 4</P></Pnts>"),
     "type 2 10=1231 11=1341"},
    {Tin("<F>2 6 3 1</F><F>3 1 2 6</F><F>1 2 6 3</F>",
         kPoints + "<Pnts><P id='6'>.5 10.5 6</P></Pnts>"),
     "type 2 10=2612 11=6316 20=3163 21=1261 30=1261 31=1631"},
    {Tin("<F>1 2 3 4</F><F>1 2 3 3</F><F>1 1 2 3</F><F>3 1 2 3</F>"),
     "type 2 2=1231 3=1231 4=3123"},
    // Damaged records cost themselves.
    {Tin("<F>1 2 3</F>\n<F>1 2 9</F><F>1 2</F>\n\n<F>1 2 3 4 5</F><F>1 2 x</F><F>1 2 -3</F>"
         "<F>1 2 2</F><F/><F>1 2 4294967296</F><F>1 2 1 3</F><F>2 4 3</F>"),
     "type 2 1=1231 11=2432"},
    {Tin("<F>1 2 3</F><F>1 2 6</F><F>1 2 7</F><F>1 3 8</F><F>1 3 9</F><F>2 4 3</F>",
         kPoints +
             "<Pnts>\n<P id='6'>1 2</P>\n<P id='7'>1 2 nan</P><P>1 2 3</P><P id='x'>1 2 3</P>"
             "<P id='8'>1 2 1e999</P><P id='9'>0,5 1 2</P><P id='6'>1 2 3 4</P>\n<P id='10'>" +
             std::string(5000, ' ') + "1 2 3</P></Pnts>"),
     "type 2 1=1231 6=2432"},
    {Tin("<F>1 2 3</F><F>2 4 3</F>", kPoints + "<Pnts><P id='1'>0 10 1</P><P id='4'>0 10 1</P>"
                                               "<P id='4'>1 11 4</P></Pnts>"),
     "type 2 1=1231"},
    // Several surfaces.
    {"<Surfaces>" + Definition(kPoints + "<Faces><F>1 2 3</F></Faces>") + Definition("", "grid") +
         Definition(kPoints) + "<Surface name='no'/></Surfaces>" + kTin,
     "type 2 1=1231; type 1; type 2 1=1231 2=2432"},
    // Without a TIN surface.
    {"<Surfaces>" + Definition(kPoints) + "</Surfaces>" + kTin, "; type 2 1=1231 2=2432"},
    {"<Surfaces>" + Definition("", "grid") + "<Surface name='FG'/></Surfaces>", ""},
    {"<Alignments/><CgPoints/><Alignments/>", ""},
    {"", ""},
};

TEST_F(LandXmlTest, EachContentGivesItsLayersOrIsRefused) {
    for (const auto& oRow : kContents)
        EXPECT_EQ(Read(Document(oRow.moContent)), oRow.mpszLayers) << oRow.moContent;
}

TEST_F(LandXmlTest, OfManyDamagedRecordsTheFirstHundredAreNamed) {
    std::string faces;
    for (int n = 0; n < 103; ++n)
        faces += "<F/>";
    EXPECT_EQ(Read(Document(Tin(faces))), "type 1");
    const std::string lines = moTranscript.Take();
    EXPECT_EQ(std::count(lines.begin(), lines.end(), '\n'), 101);
    moTranscript.moLines = lines.substr(lines.rfind("The surface", lines.size() - 2));
}

TEST_F(LandXmlTest, AnIncompleteOrHarmfulDocumentIsRefusedWhole) {
    const std::string whole = Document(kTin);
    for (std::size_t nCut = 25; nCut-- > 0;) {
        EXPECT_EQ(Read(whole.substr(0, (whole.size() - 2) * nCut / 24)), "") << nCut;
    }
    std::string bomb = "<!ENTITY e0 '0 10 1'>";
    for (int n = 0; n < 9; ++n)
        bomb += FormatString("<!ENTITY e%d '&e%d;&e%d;&e%d;&e%d;&e%d;&e%d;&e%d;&e%d;'>", n + 1, n,
                             n, n, n, n, n, n, n);
    const std::string secret = moFolder.WriteFile("secret", "<P id='1'>0 10 1</P>");
    for (const std::string& doctype :
         {bomb, "<!ENTITY e9 SYSTEM '" + secret + "'>",
          std::string("<!ENTITY % x SYSTEM 'http://127.0.0.1:9/x'> %x;")})
        EXPECT_EQ(Read("<!DOCTYPE LandXML [" + doctype + "]>\n<LandXML>" +
                       Tin("<F>1 2 3</F>", "<Pnts>&e9;</Pnts>") + "</LandXML>"),
                  "");
    EXPECT_EQ(Read("<LandXML><!--" + std::string(5 << 20, ' ') + "--></LandXML>"), "");
}

/// @return the CRS of a layer, its unit, and those of its heights; or empty
std::string DescribeCrs(ZARLayer_t* poLayer) {
    const std::string definition = GetCrs(poLayer);
    OGRSpatialReference oCrs;
    if (definition.empty() || oCrs.SetFromUserInput(definition.c_str()) != OGRERR_NONE)
        return definition;
    const char *pszName = oCrs.GetAttrValue("PROJCS"),
               *pszVertical = oCrs.GetAttrValue("COMPD_CS|VERT_CS");
    const double dfUnit = oCrs.GetTargetLinearUnits("PROJCS");
    return FormatString("%s, %.10g; %s, %.10g", pszName ? pszName : oCrs.GetName(), dfUnit,
                        pszVertical ? pszVertical : "-",
                        pszVertical ? oCrs.GetTargetLinearUnits("VERT_CS") : 0.0);
}

TEST_F(LandXmlTest, UnitsAndCoordinateSystemBecomeTheCrs) {
    const struct {
        const char* mpszUnit;
        std::string moAttributes;
        const char* mpszExpected;
    } rows[] = {
        {"meter", "", ""},
        {"foot", "name='Site'", ""},
        {"meter", "epsgCode='25832'", "ETRS89 / UTM zone 32N, 1; -, 0"},
        {"meter", "epsgCode='EPSG:25832' verticalDatum='DHHN2016'",
         "ETRS89 / UTM zone 32N, 1; DHHN2016 height, 1"},
        {"meter", "epsgCode='5555'", "ETRS89 / UTM zone 32N, 1; DHHN92 height, 1"},
        {"meter", "name='etrs89 / utm zone 32n'", "ETRS89 / UTM zone 32N, 1; -, 0"},
        {"meter", "name='utm zone 32'", ""},
        {"meter",
         "epsgCode='999999' horizontalCoordinateSystemName='WGS 84 / UTM zone 16N' name='-'",
         "WGS 84 / UTM zone 16N, 1; -, 0"},
        {"meter", "ogcWktCode='LOCAL_CS[&quot;Site&quot;]' name='x'", "Site, 1; -, 0"},
        {"USSurveyFoot", "epsgCode='2274' verticalDatum='NAVD88'",
         "NAD83 / Tennessee (ftUS), 0.3048006096; NAVD88 height (US survey foot), 0.3048006096"},
        {"foot", "epsgCode='2274' verticalDatum='Pier'",
         "NAD83 / Tennessee (ftUS), 0.3048; EGM96 height (foot), 0.3048"},
        {"millimeter", "epsgCode='25832'",
         "ETRS89 / UTM zone 32N, 0.001; EGM96 height (millimetre), 0.001"},
        {"mile", "epsgCode='25832'",
         "ETRS89 / UTM zone 32N, 1609.344; EGM96 height (Statute mile), 1609.344"},
        {"inch", "epsgCode='4326'", "WGS 84 + EGM96 height (inch), 1; EGM96 height (inch), 0.0254"},
        {"cubit", "epsgCode='25832'", ""},
    };
    for (const auto& oRow : rows) {
        const File poFile = Open(Document(
            FormatString("%s<CoordinateSystem %s/><Units><Metric linearUnit='%s'/></Units>",
                         kTin.c_str(), oRow.moAttributes.c_str(), oRow.mpszUnit)));
        EXPECT_EQ(DescribeCrs(ZARGetLayer(poFile.get(), 1)), oRow.mpszExpected)
            << oRow.moAttributes;
    }
}

TEST_F(LandXmlTest, HeightsInFeetAreConvertedAsFeet) {
    using namespace kelm::ogc::cs;
    const std::string units = "<Units><Imperial linearUnit='foot'/></Units>"
                              "<CoordinateSystem epsgCode='32632'/>";
    const std::string points = "<Pnts><P id='0'>17388451 1640420 984</P><P id='1'>17388451 1640450 "
                               "984</P><P id='2'>17388481 1640420 984</P></Pnts>";
    const std::string path =
        moFolder.WriteFile("a.xml", Document(units + Tin("<F>0 1 2</F>", points)));
    for (const auto& [eFrom, eTo, dfMetres] :
         {std::tuple(VD_Orthometric, VD_Ellipsoidal, 47), {VD_Ellipsoidal, VD_Orthometric, -47}}) {
        const auto poReader = OpenReader(path, 0, eFrom);
        poReader->SetOutputVerticalDatum(eTo);
        const std::unique_ptr<kelm::tin::Tin> poTin(poReader->Load(nullptr));
        EXPECT_NEAR(poTin->GetVertex(0)->z, 984 + dfMetres / 0.3048, 6)
            << "the geoid lies 47 m above the ellipsoid";
    }
    moTranscript.Take();
}

TEST_F(LandXmlTest, ShapesAreFoundInAnyOrderAndWalkedAgain) {
    const File poFile = Open(Document(Tin("<F>1 2 4 3</F><F i='1'>1 2 3</F><F>1 2 3</F>")));
    ZARLayer_t* poLayer = ZARGetLayer(poFile.get(), 1);
    EXPECT_EQ(ZARGetNext(poLayer, 11), 30);
    EXPECT_EQ(Describe(poLayer), "type 2 10=1241 11=1431 30=1231");
    EXPECT_EQ(Describe(poLayer), "type 2 10=1241 11=1431 30=1231");
    for (const auto& [nId, z] : {std::pair{30, 2}, {11, 4}, {30, 2}, {10, 2}})
        EXPECT_EQ(ZARGetShapeRef(poLayer, nId)->vertices[1].z, z) << nId;
    for (const int nUnknown : {-2, 1, 12, 14, 20, 31, 2147483647})
        EXPECT_TRUE(moTranscript.Refuses([&] { ZARGetNext(poLayer, nUnknown); }));
}

TEST_F(LandXmlTest, FormatsThatAreNotReadAreRefusedWithAWayToConvertThem) {
    const char* pszCity = "{\n \"type\": \"CityJSON\", \"version\": \"1.1\", \"vertices\": []}";
    for (const char* pszName : {"a.city.json", "a.json"})
        EXPECT_TRUE(moTranscript.Refuses([&] { Open(pszCity, pszName); }));
    for (const char* pszName : {"tnxy.adf", "tnz.adf"})
        moFolder.WriteFile(pszName, "");
    for (const char* pszName : {"", "tnz.adf"})
        EXPECT_TRUE(moTranscript.Refuses([&] { OpenFile(moFolder.GetPath(pszName)); }));
    EXPECT_TRUE(moTranscript.Refuses([&] { Open("<html/>"); })) << "other XML";
    const std::string square = R"({"type":"Polygon","coordinates":[[[0,0],[1,0],[0,1],[0,0]]]})";
    const File poFile =
        Open(R"({"type":"Feature","properties":{"type":"CityJSON"},"geometry":)" + square + "}",
             "b.json");
    EXPECT_EQ(Describe(ZARGetLayer(poFile.get(), 1)), "type 2 0=0000");
}

} // namespace

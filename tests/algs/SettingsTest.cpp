#include "tolkatouch/Settings.h"

#include <fstream>
#include <sstream>

#include <gtest/gtest.h>

#include "algs/Algs.h"

namespace TolkaTouch {
namespace {

std::string errorOf(std::string_view key, std::string_view text) {
    try {
        checkSetting(key, text);
    } catch (const SettingError& error) {
        return error.what();
    }
    return "no error";
}

TEST(SettingsTest, TableListsTheFourSettingsThenTheTwentyThreeFactorsThenTheAction) {
    const auto& table = settingsTable();
    ASSERT_EQ(table.size(), 28u);
    EXPECT_EQ(table[0].key, "ActivationThreshold");
    EXPECT_EQ(table[1].key, "HoldTimeoutMilliseconds");
    EXPECT_EQ(table[2].key, "EnableHoldSuppression");
    EXPECT_EQ(table[3].key, "EnableTapSuppression");
    EXPECT_EQ(table[4].key, "VirtualNormalizationFactors.0");
    EXPECT_EQ(table[26].key, "VirtualNormalizationFactors.22");
    EXPECT_EQ(table[27].key, "ResetEventStats");
    EXPECT_EQ(table[27].type, SettingType::Action);
}

TEST(SettingsTest, DefaultsAreTheRecognizersOwn) {
    const Algs algs;
    for (const Setting& setting : settingsTable()) {
        if (!setting.tunable()) continue;
        EXPECT_EQ(setting.defaultValue, algs.getState(setting.key).toDouble()) << setting.key;
    }
    EXPECT_EQ(findSetting("HoldTimeoutMilliseconds")->defaultValue, 500.0);
    EXPECT_EQ(findSetting("ActivationThreshold")->defaultValue, 200.0);
    EXPECT_EQ(findSetting("EnableTapSuppression")->defaultValue, 1.0);
    EXPECT_EQ(findSetting("VirtualNormalizationFactors.22")->defaultValue, static_cast<double>(0.6667f));
}

TEST(SettingsTest, EveryDefaultLiesInsideItsAcceptedRange) {
    for (const Setting& setting : settingsTable()) {
        EXPECT_LE(setting.minimum, setting.defaultValue) << setting.key;
        EXPECT_GE(setting.maximum, setting.defaultValue) << setting.key;
    }
}

TEST(SettingsTest, KeysAreFoundInAllThreeForms) {
    const Setting* bare = findSetting("HoldTimeoutMilliseconds");
    ASSERT_NE(bare, nullptr);
    EXPECT_EQ(findSetting("Algs.HoldTimeoutMilliseconds"), bare);
    EXPECT_EQ(findSetting("Pipeline.Algs.HoldTimeoutMilliseconds"), bare);
    EXPECT_EQ(bare->algsKey(), "Algs.HoldTimeoutMilliseconds");
    EXPECT_EQ(bare->propertyKey(), "Pipeline.Algs.HoldTimeoutMilliseconds");
    EXPECT_EQ(findSetting("Pipeline.HoldTimeoutMilliseconds"), nullptr);
    EXPECT_EQ(findSetting("Algs.EventStats"), nullptr);
    EXPECT_EQ(findSetting("VirtualNormalizationFactors.23"), nullptr);
    EXPECT_EQ(findSetting("holdtimeoutmilliseconds"), nullptr);
}

TEST(SettingsTest, KeysOfThePipelineAndAlgsDomainsAreSettingKeysAndOthersPass) {
    EXPECT_TRUE(isSettingKeyForm("Pipeline.Algs.Bogus"));
    EXPECT_TRUE(isSettingKeyForm("Pipeline.DebugInfo"));
    EXPECT_TRUE(isSettingKeyForm("Algs.HoldTimeoutMiliseconds"));
    EXPECT_TRUE(isSettingKeyForm("ActivationThreshold"));
    EXPECT_FALSE(isSettingKeyForm("ServicePluginDebug"));
    EXPECT_FALSE(isSettingKeyForm("Version"));
}

TEST(SettingsTest, AMisspeltKeyIsRefusedWithTheNearestKeyInTheSameForm) {
    EXPECT_EQ(errorOf("Algs.HoldTimeoutMiliseconds", "1000"),
              "unknown setting \"Algs.HoldTimeoutMiliseconds\" (did you mean \"Algs.HoldTimeoutMilliseconds\"?)");
    EXPECT_EQ(errorOf("Pipeline.Algs.ActivationTreshold", "1"),
              "unknown setting \"Pipeline.Algs.ActivationTreshold\" (did you mean \"Pipeline.Algs.ActivationThreshold\"?)");
    EXPECT_EQ(nearestSettingKey("VirtualNormalisationFactors.3"), "VirtualNormalizationFactors.3");
}

TEST(SettingsTest, AValueThatIsNotOfTheKeysTypeNamesTheAcceptedRange) {
    EXPECT_EQ(errorOf("Algs.HoldTimeoutMilliseconds", "banana"),
              "setting \"Algs.HoldTimeoutMilliseconds\" takes a whole number of milliseconds from 1 to 60000, "
              "not \"banana\"");
    EXPECT_EQ(errorOf("Algs.HoldTimeoutMilliseconds", "0"),
              "setting \"Algs.HoldTimeoutMilliseconds\" takes a whole number of milliseconds from 1 to 60000, not \"0\"");
    EXPECT_EQ(errorOf("Algs.HoldTimeoutMilliseconds", "700.5"),
              "setting \"Algs.HoldTimeoutMilliseconds\" takes a whole number of milliseconds from 1 to 60000, "
              "not \"700.5\"");
    EXPECT_EQ(errorOf("ActivationThreshold", "nan"),
              "setting \"ActivationThreshold\" takes a number from 1 to 10000, not \"nan\"");
    EXPECT_EQ(errorOf("EnableTapSuppression", "yes"),
              "setting \"EnableTapSuppression\" takes true or false, not \"yes\"");
    EXPECT_EQ(errorOf("VirtualNormalizationFactors.4", "-0.5"),
              "setting \"VirtualNormalizationFactors.4\" takes a number from 0 to 4, not \"-0.5\"");
}

TEST(SettingsTest, ControlCharactersInAnEchoedValueAreEscaped) {
    EXPECT_EQ(errorOf("ActivationThreshold", "\x1b[2J"),
              "setting \"ActivationThreshold\" takes a number from 1 to 10000, not \"\\x1b[2J\"");
}

TEST(SettingsTest, GoodTextBecomesTheValueTheRecognizerReads) {
    const CheckedSetting hold = checkSetting("Algs.HoldTimeoutMilliseconds", "700");
    EXPECT_EQ(hold.setting->key, "HoldTimeoutMilliseconds");
    EXPECT_EQ(hold.value.unsignedInteger(), 700u);
    EXPECT_EQ(checkSetting("ActivationThreshold", "150.5").value.floating(), 150.5);
    EXPECT_EQ(checkSetting("EnableHoldSuppression", "false").value.boolean(), false);
    EXPECT_EQ(checkSetting("EnableHoldSuppression", "1").value.boolean(), true);
    EXPECT_TRUE(checkSetting("Pipeline.Algs.ResetEventStats", "anything").value.isNull());
}

TEST(SettingsTest, ValuesFromJsonAreCheckedByKindAndRange) {
    EXPECT_EQ(checkSetting("HoldTimeoutMilliseconds", PropertyValue(800)).value.unsignedInteger(), 800u);
    EXPECT_EQ(checkSetting("HoldTimeoutMilliseconds", PropertyValue(800.0)).value.unsignedInteger(), 800u);
    EXPECT_EQ(checkSetting("EnableTapSuppression", PropertyValue(0)).value.boolean(), false);
    EXPECT_THROW(checkSetting("HoldTimeoutMilliseconds", PropertyValue(-5)), SettingError);
    EXPECT_THROW(checkSetting("HoldTimeoutMilliseconds", PropertyValue("800")), SettingError);
    EXPECT_THROW(checkSetting("EnableTapSuppression", PropertyValue(2)), SettingError);
    EXPECT_THROW(checkSetting("ActivationThreshold", PropertyValue()), SettingError);
}

TEST(SettingsTest, AnAssignmentSplitsAtTheFirstEqualsSign) {
    const CheckedSetting checked = checkSettingAssignment("Algs.ActivationThreshold=250");
    EXPECT_EQ(checked.setting->key, "ActivationThreshold");
    EXPECT_EQ(checked.value.floating(), 250.0);
    try {
        checkSettingAssignment("Algs.ActivationThreshold");
        FAIL() << "no error";
    } catch (const SettingError& error) {
        EXPECT_STREQ(error.what(), "\"Algs.ActivationThreshold\" is not KEY=VALUE");
    }
}

TEST(SettingsTest, DefaultsAreWrittenAsACommandLineTakesThem) {
    EXPECT_EQ(defaultText(*findSetting("HoldTimeoutMilliseconds")), "500");
    EXPECT_EQ(defaultText(*findSetting("ActivationThreshold")), "200");
    EXPECT_EQ(defaultText(*findSetting("EnableHoldSuppression")), "true");
    EXPECT_EQ(defaultText(*findSetting("VirtualNormalizationFactors.0")), "0.6667");
    for (const Setting& setting : settingsTable()) {
        if (setting.tunable()) {
            EXPECT_NO_THROW(checkSetting(setting.key, defaultText(setting))) << setting.key;
        }
    }
}

// The README's settings table is the table above written out for people; they must agree row for
// row: key, default, accepted values and meaning.
TEST(SettingsTest, ReadmeSettingsTableAgreesWithTheTable) {
    std::ifstream readme(TOLKA_SOURCE_DIR "/README.md");
    ASSERT_TRUE(readme) << "README.md not found";
    std::stringstream text;
    text << readme.rdbuf();
    const std::string all = text.str();
    const size_t start = all.find("| setting | default | accepted values | meaning |");
    ASSERT_NE(start, std::string::npos) << "README has no settings table";
    std::istringstream lines(all.substr(start));
    std::string line;
    std::getline(lines, line);  // header
    std::getline(lines, line);  // rule
    std::vector<std::string> rows;
    while (std::getline(lines, line) && line.rfind("|", 0) == 0) rows.push_back(line);
    ASSERT_EQ(rows.size(), settingsTable().size());
    for (size_t i = 0; i < rows.size(); ++i) {
        const Setting& setting = settingsTable()[i];
        const std::string expected = "| `" + setting.algsKey() + "` | " + defaultText(setting) + " | " +
                                     acceptedValues(setting) + " | " + setting.meaning + " |";
        EXPECT_EQ(rows[i], expected);
    }
}

}  // namespace
}  // namespace TolkaTouch

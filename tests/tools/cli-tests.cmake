# Tests that run the built tolkatouch program, as a user runs it, through check_tolkatouch.sh.
set(tolkatouch $<TARGET_FILE:tolkatouch>)
set(check bash ${CMAKE_CURRENT_LIST_DIR}/check_tolkatouch.sh)
set(expected ${CMAKE_CURRENT_LIST_DIR}/expected)
set(data ${CMAKE_CURRENT_LIST_DIR}/data)
set(examples ${PROJECT_SOURCE_DIR}/examples)

# tolka_add_cli_test(<Sentence> <check options> -- <tolkatouch arguments>)
function(tolka_add_cli_test name)
  list(FIND ARGN "--" separator)
  list(SUBLIST ARGN 0 ${separator} options)
  math(EXPR first "${separator} + 1")
  set(arguments)
  list(LENGTH ARGN count)
  if(first LESS count)
    list(SUBLIST ARGN ${first} -1 arguments)
  endif()
  add_test(NAME TolkatouchCliTest.${name} COMMAND ${check} ${options} -- ${tolkatouch} ${arguments})
  set_tests_properties(TolkatouchCliTest.${name} PROPERTIES LABELS "cli")
endfunction()

# Replay of every example, compared with what it printed when it was checked in.
foreach(example everyday-session reset-during-hold version0-session)
  tolka_add_cli_test(ReplayJsonFastOf-${example}-PrintsItsEvents
    --stdout ${expected}/${example}.jsonl --stderr-empty -- replay --fast --json ${examples}/${example}.json)
endforeach()
tolka_add_cli_test(ReplayPrintsOneAlignedLinePerEvent
  --stdout ${expected}/reset-during-hold.human.txt --stderr-empty -- replay --fast ${examples}/reset-during-hold.json)
tolka_add_cli_test(ReplayWithoutDocumentPlaysTheBuiltInSample
  --stdout ${expected}/everyday-session.jsonl -- replay --fast --json)
tolka_add_cli_test(ReplayReadsTheDocumentFromStandardInput
  --stdin ${examples}/reset-during-hold.json --stdout ${expected}/reset-during-hold.jsonl -- replay --fast --json -)
tolka_add_cli_test(ReplayAtAHigherSpeedPrintsTheSameEvents
  --stdout ${expected}/version0-session.jsonl -- replay --speed 8 --json ${examples}/version0-session.json)

# Counters at the end.
tolka_add_cli_test(ReplayStatsEndsWithATableOfTheNonZeroCounters
  --stdout ${expected}/everyday-session.stats.txt -- replay --fast --stats ${examples}/everyday-session.json)
tolka_add_cli_test(ReplayJsonStatsEndsWithOneStatsLine
  --stdout ${expected}/reset-during-hold.stats.jsonl -- replay --fast --json --stats ${examples}/reset-during-hold.json)

# Settings before the first frame: the 700 ms hold of the everyday session is no hold with a
# hold timeout of 1000 ms.
tolka_add_cli_test(ReplaySetHoldTimeoutTurnsTheShortHoldIntoNoHold
  --stdout ${expected}/everyday-session.hold-timeout-1000.jsonl
  -- replay --fast --json --set Algs.HoldTimeoutMilliseconds=1000 ${examples}/everyday-session.json)
tolka_add_cli_test(ReplaySetIsRepeatable
  --stdout ${expected}/version0-session.no-holds.jsonl
  -- replay --fast --json --set Algs.HoldTimeoutMilliseconds=5000 --set Algs.EnableTapSuppression=false
     ${examples}/version0-session.json)
tolka_add_cli_test(ReplaySettingsFileAppliesItsSettingsLikeSet
  --stdout ${expected}/everyday-session.hold-timeout-1000.jsonl --stderr-empty
  -- replay --fast --json --settings ${data}/hold-timeout-1000.settings ${examples}/everyday-session.json)
tolka_add_cli_test(ReplaySetWinsOverTheSettingsFile
  --stdout ${expected}/everyday-session.jsonl --stderr-empty
  -- replay --fast --json --settings ${data}/hold-timeout-1000.settings --set Algs.HoldTimeoutMilliseconds=500
     ${examples}/everyday-session.json)
tolka_add_cli_test(ReplayRefusesASettingsFileLineWithoutEquals
  --exit 1 --stdout-empty
  --stderr-text "tolkatouch: ${data}/no-equals.settings: line 2: expected KEY=VALUE"
  -- replay --fast --settings ${data}/no-equals.settings ${examples}/everyday-session.json)
tolka_add_cli_test(ReplayDescribeWritesTheDescriptionsToStandardError
  --stdout ${expected}/version0-session.jsonl --stderr-contains "*** Virtual State Description ***"
  -- replay --fast --json --describe ${examples}/version0-session.json)

# Document errors: one line on standard error, exit 1, no events.
# An optional fourth argument is the error's second line: the reason and where the reader stopped.
function(tolka_add_document_error_test name file message)
  set(text "tolkatouch: ${file}: ${message}")
  if(ARGC GREATER 3)
    string(APPEND text "\n  ${ARGV3}")
  endif()
  tolka_add_cli_test(${name} --exit 1 --stdout-empty --stderr-text "${text}" -- replay --fast --json ${file})
endfunction()
tolka_add_document_error_test(ReplayOfAMissingFileFails ${data}/no-such-recording.json "No such file or directory")
tolka_add_document_error_test(ReplayOfADirectoryFails ${data} "Is a directory")
tolka_add_document_error_test(ReplayOfTextThatIsNotJsonFails ${data}/not-json.json
  "migrateSerializedContainer failed: invalid container"
  "byte 1 (line 1, column 2): syntax error while parsing value - invalid literal, last read: 'th'")
# The parser's reason ends in a list of brackets, which a CMake list cannot carry whole.
tolka_add_cli_test(ReplayOfAnEmptyFileFails --exit 1 --stdout-empty
  --stderr-contains "  byte 0 (line 1, column 1): syntax error while parsing value - unexpected end of input, expected "
  -- replay --fast --json ${data}/empty.json)
tolka_add_document_error_test(ReplayOfAnUnknownVersionFails ${data}/version-2.json
  "migrateSerializedContainer failed: invalid container version: 2" "the versions this program reads are 0 and 1")
tolka_add_document_error_test(ReplayOfADocumentWithoutFramesFails ${data}/no-frames.json "invalid frames"
  "\"Frames\" is missing or is not an array")
tolka_add_document_error_test(ReplayOfAReportThatIsNotHexFails ${data}/bad-hex.json "invalid hex string"
  "in frame 1, at byte 44 (line 4, column 9)")
tolka_add_document_error_test(ReplayOfAnUnknownFrameTypeFails ${data}/lower-case-type.json "invalid frame type"
  "in frame 1, at byte 44 (line 4, column 9)")
tolka_add_document_error_test(ReplayOfAVersionZeroReportWithoutDataFails ${data}/version-0-no-report-data.json
  "migrateSerializedContainer failed: frame lacks ReportData" "a report of \"Reports\" has no \"ReportData\"")
tolka_add_cli_test(ReplayOfABadDocumentOnStandardInputNamesIt
  --stdin ${data}/not-json.json --exit 1 --stdout-empty
  --stderr-text "tolkatouch: -: migrateSerializedContainer failed: invalid container\n  byte 1 (line 1, column 2): syntax error while parsing value - invalid literal, last read: 'th'"
  -- replay -)
tolka_add_cli_test(ShowOfABadDocumentFails --exit 1 --stdout-empty
  --stderr-text "tolkatouch: ${data}/version-2.json: migrateSerializedContainer failed: invalid container version: 2\n  the versions this program reads are 0 and 1"
  -- show ${data}/version-2.json)
tolka_add_cli_test(ConvertOfAMissingFileFails --exit 1 --stdout-empty
  --stderr-text "tolkatouch: ${data}/no-such-recording.json: No such file or directory"
  -- convert ${data}/no-such-recording.json -o -)

# Bad options: the usage, exit 2.
tolka_add_cli_test(NoSubcommandPrintsTheUsage --exit 2 --stdout-empty --stderr-contains "Usage: tolkatouch" --)
tolka_add_cli_test(UnknownOptionPrintsTheUsage --exit 2 --stdout-empty --stderr-contains "Usage: tolkatouch replay"
  -- replay --fastest ${examples}/version0-session.json)
tolka_add_cli_test(SpeedAndFastTogetherPrintTheUsage --exit 2 --stdout-empty --stderr-contains "Usage: tolkatouch replay"
  -- replay --fast --speed 2 ${examples}/version0-session.json)
tolka_add_cli_test(SpeedOfZeroPrintsTheUsage --exit 2 --stdout-empty --stderr-contains "Usage: tolkatouch replay"
  -- replay --speed 0 ${examples}/version0-session.json)
tolka_add_cli_test(SetWithoutEqualsPrintsTheUsage --exit 2 --stdout-empty --stderr-contains "Usage: tolkatouch replay"
  -- replay --set Algs.HoldTimeoutMilliseconds ${examples}/version0-session.json)
tolka_add_cli_test(ConvertWithoutOutputPrintsTheUsage --exit 2 --stdout-empty --stderr-contains "Usage: tolkatouch convert"
  -- convert ${examples}/version0-session.json)
foreach(command replay synth show convert)
  tolka_add_cli_test(HelpOf-${command}-Succeeds --stderr-empty -- ${command} --help)
endforeach()

# synth: an example script gives back its checked-in document. everyday-session.json is left out:
# it is a golden input, frozen as the earlier finger model made its brushes.
foreach(example reset-during-hold)
  tolka_add_cli_test(SynthOf-${example}-ReproducesItsDocument
    --stdout ${examples}/${example}.json --stderr-empty -- synth ${examples}/${example}.txt)
endforeach()
tolka_add_cli_test(SynthOfABadScriptNamesTheLine --exit 1 --stdout-empty
  --stderr-text "tolkatouch: ${data}/bad-gesture.txt: line 3: unknown gesture 'jump' (tap, hold, slide, brush, wait, reset, set)"
  -- synth ${data}/bad-gesture.txt)

# show and convert.
tolka_add_cli_test(ShowFrameDrawsThatImage
  --stdout ${expected}/everyday-session.frame-1279.txt -- show --frame 1279 ${examples}/everyday-session.json)
tolka_add_cli_test(ShowRawDrawsTheRawReadings
  --stdout ${expected}/everyday-session.frame-1279.raw.txt -- show --raw --frame 1279 ${examples}/everyday-session.json)
tolka_add_cli_test(ShowListsResetsAndImagesInOrder
  --stdout ${expected}/short-with-reset.show.txt -- show ${data}/short-with-reset.json)
tolka_add_cli_test(ConvertOfTheVersionZeroExampleWritesVersionOne
  --stdout ${expected}/version0-session.converted.json -- convert ${examples}/version0-session.json -o -)

# Settings are checked against the settings table before anything is played.
tolka_add_cli_test(ReplayWithAMisspeltSettingNamesTheNearestKeyAndExitsTwo
  --exit 2 --stdout-empty
  --stderr-text "tolkatouch: unknown setting \"Algs.HoldTimeoutMiliseconds\" (did you mean \"Algs.HoldTimeoutMilliseconds\"?)"
  -- replay --fast --set Algs.HoldTimeoutMiliseconds=1000 ${examples}/reset-during-hold.json)
tolka_add_cli_test(ReplayWithASettingValueOfTheWrongTypeNamesTheRangeAndExitsTwo
  --exit 2 --stdout-empty
  --stderr-text "tolkatouch: setting \"Algs.HoldTimeoutMilliseconds\" takes a whole number of milliseconds from 1 to 60000, not \"banana\""
  -- replay --fast --set Algs.HoldTimeoutMilliseconds=banana ${examples}/reset-during-hold.json)
tolka_add_cli_test(ReplayTakesTheSettingInThePropertysKeyFormToo
  --stdout ${expected}/everyday-session.hold-timeout-1000.jsonl
  -- replay --fast --json --set Pipeline.Algs.HoldTimeoutMilliseconds=1000 ${examples}/everyday-session.json)
tolka_add_cli_test(ReplayRefusesASpeedBelowAHundredth
  --exit 2 --stdout-empty --stderr-contains "the speed must be a number from 0.01 to 1000"
  -- replay --speed 1e-30 ${examples}/reset-during-hold.json)
tolka_add_cli_test(AMistypedSubcommandIsNamedWithTheNearestOne
  --exit 2 --stdout-empty
  --stderr-text "tolkatouch: unknown subcommand \"reply\" (did you mean \"replay\"?)"
  -- reply --fast)
tolka_add_cli_test(VersionPrintsTheProgramAndItsVersion
  --stderr-empty --stdout-contains "tolkatouch ${PROJECT_VERSION}" -- --version)
# An escape character (no brackets: CMake lists treat them specially).
string(ASCII 27 escape)
tolka_add_cli_test(ControlCharactersInAnErrorAreShownEscaped
  --exit 2 --stdout-empty
  --stderr-text "tolkatouch: unknown subcommand \"\\x1bcreplay\" (did you mean \"replay\"?)"
  -- "${escape}creplay")

# show's time range, summary and JSON.
tolka_add_cli_test(ShowSummaryCountsImagesFirmwareEventsAndSettings
  --stdout ${expected}/reset-during-hold.summary.txt --stderr-empty -- show --summary ${examples}/reset-during-hold.json)
tolka_add_cli_test(ShowSummaryOfATimeRangeAsJsonCountsOnlyThatRange
  --stdout ${expected}/reset-during-hold.summary-500-1500.json --stderr-empty
  -- show --summary --json --from 500 --to 1500 ${examples}/reset-during-hold.json)

# devices without a daemon: udev's list, and a line that says no daemon answered.
tolka_add_cli_test(DevicesWithoutADaemonSaysSoAndListsWhatUdevKnows
  --exit 0 --stderr-contains "no daemon answers" -- devices --socket /nonexistent/tolkatouchd.sock --vendor 0000 --product 0000)

# eval and sweep.
add_test(NAME ShippedCorpusEvaluatesTheSameForAnyThreadsAndShards
         COMMAND bash ${CMAKE_CURRENT_SOURCE_DIR}/corpus_check.sh $<TARGET_FILE:tolkatouch> ${CMAKE_CURRENT_BINARY_DIR}/corpus-check)
set_tests_properties(ShippedCorpusEvaluatesTheSameForAnyThreadsAndShards PROPERTIES LABELS corpus TIMEOUT 600)
tolka_add_cli_test(EvalOfADocumentWithoutLabelsNamesItAndFails --exit 1
  --stderr-contains "${examples}/reset-during-hold.json: no labels: ${examples}/reset-during-hold.labels.json: No such file or directory"
  -- eval ${examples}/reset-during-hold.json)
tolka_add_cli_test(EvalWithABadShardPrintsTheUsage --exit 2 --stdout-empty --stderr-contains "expected I/N with 1 <= I <= N"
  -- eval --shard 3/2 ${examples})
tolka_add_cli_test(EvalOfNothingSaysSo --exit 1 --stdout-empty
  --stderr-text "tolkatouch: corpus: no recordings named (give documents, folders or --list)" -- eval)
tolka_add_cli_test(SweepByAnUnknownMetricPrintsTheUsage --exit 2 --stdout-empty --stderr-contains "unknown metric 'speed'"
  -- sweep --grid HoldTimeoutMilliseconds=400,500 --metric speed ${examples})
tolka_add_cli_test(SweepOfAnUnknownSettingNamesIt --exit 2 --stdout-empty --stderr-contains "HoldTimeout"
  -- sweep --grid HoldTimeout=400,500 ${examples})
foreach(command eval sweep)
  tolka_add_cli_test(HelpOf-${command}-Succeeds --stderr-empty -- ${command} --help)
endforeach()

# record.
add_test(NAME RecordEndsWithAWholeRecordingHoweverItStops
         COMMAND bash ${CMAKE_CURRENT_SOURCE_DIR}/record_check.sh $<TARGET_FILE:tolkatouch> ${CMAKE_CURRENT_BINARY_DIR}/record-check)
set_tests_properties(RecordEndsWithAWholeRecordingHoweverItStops PROPERTIES LABELS cli TIMEOUT 120)
tolka_add_cli_test(RecordWithABadRotationPrintsTheUsage --exit 2 --stdout-empty --stderr-contains "expected a size (100M, 512K) or a duration (30s, 10min, 1h)"
  -- record --device /dev/null --rotate 10parsecs -o ${CMAKE_CURRENT_BINARY_DIR}/bad-rotation.jsonl)
tolka_add_cli_test(HelpOf-record-Succeeds --stderr-empty -- record --help)

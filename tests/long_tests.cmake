# SPDX-License-Identifier: Apache-2.0
# What ctest reads after it has listed the tests: those that take longest, which therefore start first. Two labels:
#   in_full  repeats something for its own sake, and does so less often unless SSOCLIENT_TESTS_IN_FULL is set, as it is by
#            scripts/check in_full; all of integration_signature_oracle has the label too
#   waits    waits for a time-out of the library that has no shorter form

# ssoclient_mark(COST LABEL TEST…)
function(ssoclient_mark cost label)
  set_tests_properties(${ARGN} PROPERTIES COST ${cost} LABELS ${label})
endfunction()

ssoclient_mark(42 waits AServiceThatStalls.EndsALegAfterFortySecondsAndNoOtherRequestSoSoon)
ssoclient_mark(30 in_full
  PrefixesOfDocuments.AreReadAlikeByAllReaders
  GeneratedDocuments.AreReadAlikeByAllReadersExceptForNamedDifferences)
ssoclient_mark(20 in_full
  PositionOfRefusal.IsOnTheLineThatLibxml2ReportsExceptForNamedDifferences
  PositionOfRefusal.IsAfterTextThatAWellFormedDocumentMayBeginWith
  DocumentBetweenGuardPages.IsReadAsElsewhere
  OneServiceOnSixteenThreadsOverTls.RunsTwentyThousandOperationsWithoutErrorOrGrowth
  OneServiceOnSixteenThreads.ComposesReadsAndVerifiesTwentyThousandTimesWithoutErrorOrGrowth
  Of/Truncation.EveryPrefixIsRefusedByTheParser/bearer_50k)

# SPDX-License-Identifier: Apache-2.0
# ctest reads this after it has listed the tests. The longest tests start first. Two labels:
#   in_full  a test whose point is repetition: it repeats less often unless SSOCLIENT_TESTS_IN_FULL is set, which
#            scripts/check in_full does; all of integration_signature_oracle has the label too
#   waits    a test that waits for a time-out of the library, which cannot be shortened

# ssoclient_mark(COST LABEL TEST…)
function(ssoclient_mark cost label)
  set_tests_properties(${ARGN} PROPERTIES COST ${cost} LABELS ${label})
endfunction()

ssoclient_mark(42 waits StallingService.MakesALegTimeOutAfterFortySecondsButNoOtherRequest)
ssoclient_mark(30 in_full
  PrefixesOfDocuments.AreReadAlikeByAllReaders
  GeneratedDocuments.AreReadAlikeByAllReadersExceptForNamedDifferences)
ssoclient_mark(20 in_full
  ChangedMessages.AreAcceptedOnlyIfTheCoveredElementsAreTheSignedOnes
  HostileHeader.IsExplainedInLinearTime
  TokenSourceModel.DoesTheSameAsTheSourceAfterEachOfManyRandomEvents
  PositionOfRefusal.IsOnTheLineThatLibxml2ReportsExceptForNamedDifferences
  PositionOfRefusal.IsAfterTextThatAWellFormedDocumentMayBeginWith
  DocumentBetweenGuardPages.IsReadAsElsewhere
  OneServiceOnSixteenThreadsOverTls.RunsTwentyThousandOperationsWithoutErrorOrGrowth
  Over/ClientSoak.HasOneOutcomeForEachOperationAndDoesNotGrow/Tcp
  Over/ClientSoak.HasOneOutcomeForEachOperationAndDoesNotGrow/Tls
  Over/ManyAcquisitions.AreUnderWayAtOnceOnFewThreadsInLittleMemoryAndAllAreRight/Tls
  Over/ManyAcquisitions.AllEndWhenTheyAreCancelledAndCloseTheirConnections/Tls
  Over/ManyAcquisitions.AllEndWhenTheirClientIsDestroyed/Tls
  OneServiceOnSixteenThreads.ComposesReadsAndVerifiesTwentyThousandTimesWithoutErrorOrGrowth
  Of/Truncation.EveryPrefixIsRefusedByTheParser/bearer_50k)

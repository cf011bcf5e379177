// Operations come first: who looks for "median" wants filter_median before pages that speak of it.
var Scorer = {
  score: function (result) {
    var isOperation = result[0].indexOf("operations/") === 0 && result[0] !== "operations/index";
    return result[4] + (isOperation ? 20 : 0);
  },
  objNameMatch: 11, objPartialMatch: 6, objPrio: { 0: 15, 1: 5, 2: -5 }, objPrioDefault: 0,
  title: 15, partialTitle: 7, term: 5, partialTerm: 2
};

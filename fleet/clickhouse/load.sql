INSERT INTO `{{table}}` FORMAT TabSeparatedWithNames
